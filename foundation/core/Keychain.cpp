#include "foundation/core/Keychain.h"

#include <atomic>
#include <cerrno>
#include <mutex>
#include <vector>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/KeychainStoreFormat.h"
#include "foundation/core/SecretServiceStore.h"
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

std::atomic<KeychainStore> sChosenStore{KeychainStore_File};

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

// Runs `change` on the entries of the file store and writes them back when
// it says so. The caller holds StoreMutex().
template <class Change>
bool UpdateFileStore(Change change)
{
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

bool EraseFromFileStore(const UTF16String& domain, const UTF16String& account)
{
    return UpdateFileStore(
        [&](KeychainEntries& entries) { return entries.erase(std::make_pair(domain, account)) > 0; });
}

UTF16String ReadFromFileStore(const UTF16String& domain, const UTF16String& account)
{
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

bool SystemChosen()
{
    return sChosenStore.load() == KeychainStore_System;
}

}  // namespace

void Keychain::SetStore(KeychainStore store)
{
    sChosenStore.store(store);
}

KeychainStore Keychain::GetStore()
{
    return sChosenStore.load();
}

bool Keychain::SystemStoreUsable(std::string& reason)
{
    std::lock_guard<std::mutex> lock(StoreMutex());
    return detail::SecretServiceUsable(reason);
}

bool Keychain::SetPassword(const UTF16String& domain, const UTF16String& account, const UTF16String& password)
{
    std::lock_guard<std::mutex> lock(StoreMutex());
    if (!SystemChosen()) {
        return UpdateFileStore([&](KeychainEntries& entries) {
            entries[std::make_pair(domain, account)] = password;
            return true;
        });
    }
    std::string error;
    if (!detail::SecretServiceStore(domain, account, password, error)) {
        TOLMO_TRACE("tolmonetsync", 1, "Keychain not written: " << error);
        return false;
    }
    // Stored safely elsewhere; an older copy in the file would outlive a
    // later removal there and be read back as the fallback.
    if (!EraseFromFileStore(domain, account))
        TOLMO_TRACE("tolmonetsync", 1, "Keychain: an older copy stays in the file store");
    return true;
}

UTF16String Keychain::GetPassword(const UTF16String& domain, const UTF16String& account)
{
    std::lock_guard<std::mutex> lock(StoreMutex());
    if (SystemChosen()) {
        UTF16String password;
        std::string error;
        const detail::SecretLookup found = detail::SecretServiceLookup(domain, account, password, error);
        if (found == detail::SecretLookup_Found) return password;
        if (found == detail::SecretLookup_Failed)
            TOLMO_TRACE("tolmonetsync", 1, "Keychain read falls back to the file store: " << error);
    }
    return ReadFromFileStore(domain, account);
}

bool Keychain::RemovePassword(const UTF16String& domain, const UTF16String& account)
{
    std::lock_guard<std::mutex> lock(StoreMutex());
    bool removed = true;
    if (SystemChosen()) {
        std::string error;
        removed = detail::SecretServiceRemove(domain, account, error);
        if (!removed) TOLMO_TRACE("tolmonetsync", 1, "Keychain entry not removed: " << error);
    }
    return EraseFromFileStore(domain, account) && removed;
}

}  // namespace security
}  // namespace tolmocore
