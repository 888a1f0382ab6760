#include "foundation/core/Keychain.h"

#include <cerrno>
#include <mutex>
#include <vector>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/KeychainStoreFormat.h"
#include "foundation/core/Trace.h"

namespace tolmocore {
namespace security {
namespace {

using detail::KeychainEntries;
using filesupport::Dir;
using filesupport::File;

const char16_t kStoreName[] = u"keychain.store";
// A store this large is not one we wrote; reading it whole is not worth it.
constexpr std::uint64_t kMaxStoreBytes = 16 * 1024 * 1024;
constexpr mode_t kStorePermissions = 0600;

std::mutex& StoreMutex()
{
    static std::mutex* sMutex = new std::mutex;  // outlives static destructors
    return *sMutex;
}

File StoreFile()
{
    return File(Dir::PrefDir(), UTF16String(kStoreName));
}

// A missing store reads as empty. False if it exists and cannot be read.
bool ReadStore(const File& store, KeychainEntries& entries)
{
    try {
        filesupport::IPlatformByteStream in(store, 1);
        if (in.Length() > kMaxStoreBytes) {
            TOLMO_TRACE("tolmonetsync", 1, "Keychain store too large: " << store.FullPath());
            return false;
        }
        std::vector<unsigned char> bytes(static_cast<size_t>(in.Length()));
        if (!bytes.empty()) in.ReadBlock(bytes.data(), static_cast<unsigned int>(bytes.size()));
        entries = detail::ParseKeychainStore(bytes.data(), bytes.size());
        return true;
    } catch (const filesupport::FileSystemError& error) {
        if (error.Code() == ENOENT) return true;
        TOLMO_TRACE("tolmonetsync", 1, "Keychain store unreadable: " << error.what());
    } catch (const std::exception& error) {
        TOLMO_TRACE("tolmonetsync", 1, "Keychain store unreadable: " << error.what());
    }
    return false;
}

bool WriteStore(const File& store, const KeychainEntries& entries)
{
    try {
        store.Parent().CreatePrivate();
        const std::string text = detail::SerializeKeychainStore(entries);
        filesupport::OPlatformByteStream out(store, 1, kStorePermissions);
        out.WriteBlock(reinterpret_cast<const unsigned char*>(text.data()), static_cast<unsigned int>(text.size()));
        out.Close();
        return true;
    } catch (const std::exception& error) {
        TOLMO_TRACE("tolmonetsync", 1, "Keychain store not written: " << error.what());
        return false;
    }
}

// Runs `change` on the entries and writes them back when it says so.
template <class Change>
bool UpdateStore(Change change)
{
    std::lock_guard<std::mutex> lock(StoreMutex());
    try {
        const File store = StoreFile();
        KeychainEntries entries;
        if (!ReadStore(store, entries)) return false;
        return !change(entries) || WriteStore(store, entries);
    } catch (const std::exception& error) {  // PrefDir() without a home
        TOLMO_TRACE("tolmonetsync", 1, "Keychain unavailable: " << error.what());
        return false;
    }
}

}  // namespace

bool Keychain::SetPassword(const UTF16String& domain, const UTF16String& account, const UTF16String& password)
{
    return UpdateStore([&](KeychainEntries& entries) {
        entries[std::make_pair(domain, account)] = password;
        return true;
    });
}

UTF16String Keychain::GetPassword(const UTF16String& domain, const UTF16String& account)
{
    std::lock_guard<std::mutex> lock(StoreMutex());
    try {
        KeychainEntries entries;
        if (!ReadStore(StoreFile(), entries)) return UTF16String();
        const auto found = entries.find(std::make_pair(domain, account));
        return found == entries.end() ? UTF16String() : found->second;
    } catch (const std::exception& error) {
        TOLMO_TRACE("tolmonetsync", 1, "Keychain unavailable: " << error.what());
        return UTF16String();
    }
}

bool Keychain::RemovePassword(const UTF16String& domain, const UTF16String& account)
{
    return UpdateStore([&](KeychainEntries& entries) { return entries.erase(std::make_pair(domain, account)) > 0; });
}

}  // namespace security
}  // namespace tolmocore
