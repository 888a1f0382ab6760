// The keychain store parser on arbitrary bytes: it must never crash, and what
// it reads must survive being written and read again unchanged.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "foundation/core/KeychainStoreFormat.h"

using tolmocore::security::detail::KeychainEntries;
using tolmocore::security::detail::ParseKeychainStore;
using tolmocore::security::detail::SerializeKeychainStore;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    const KeychainEntries entries = ParseKeychainStore(data, size);
    const std::string text = SerializeKeychainStore(entries);
    const KeychainEntries again = ParseKeychainStore(reinterpret_cast<const unsigned char*>(text.data()), text.size());
    if (again != entries) std::abort();
    if (SerializeKeychainStore(again) != text) std::abort();
    return 0;
}
