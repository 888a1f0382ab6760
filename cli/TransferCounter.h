#pragma once
// Counts the bytes the command's requests move, for the progress line: a
// wrapper in front of the process-wide request processor that adds each
// answered request's body sizes as its handler runs. Clients take the
// processor when they are made, so install it before making one.

#include <cstdint>

namespace tolmonetsync {
namespace cli {

// Puts the counter in front of the process-wide processor; a second call
// does nothing. From the main thread, before any client is made.
void InstallTransferCounter();

// Bytes sent and received by answered requests so far; 0 without the
// counter. Any thread.
std::uint64_t TransferredBytes();

}  // namespace cli
}  // namespace tolmonetsync
