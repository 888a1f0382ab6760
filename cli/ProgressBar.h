#pragma once
// The progress line of `sync` on a terminal, redrawn in place: the fraction
// done as a bar and, while files move, how many of how many, the bytes moved
// and the rate.

#include <cstdint>
#include <ostream>
#include <string>

namespace tolmonetsync {
namespace cli {

class ProgressBar {
public:
    // Draws nothing unless `shown`.
    ProgressBar(std::ostream& out, bool shown) : mOut(out), mShown(shown) {}
    ~ProgressBar() { Clear(); }
    ProgressBar(const ProgressBar&) = delete;
    ProgressBar& operator=(const ProgressBar&) = delete;

    void Draw(const char* label, float fraction);
    // As Draw, followed by "DONE/TOTAL files, BYTES at RATE/s".
    void DrawTransfer(const char* label, float fraction, std::size_t total, std::uint64_t bytes, double seconds);
    void Clear();

private:
    void Show(const std::string& line);

    std::ostream& mOut;
    bool mShown;
    std::size_t mDrawnWidth = 0;  // of the line on screen; 0 when none is
};

// "512 bytes", "1.5 KiB", "3.2 MiB", ...
std::string ByteCountText(std::uint64_t bytes);

}  // namespace cli
}  // namespace tolmonetsync
