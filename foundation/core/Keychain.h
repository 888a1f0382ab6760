#pragma once
// Passwords kept for the user between runs.
//
// On Linux the store is the file "keychain.store" in Dir::PrefDir(), readable
// by the user alone: it is made with mode 0600 and every rewrite replaces it
// atomically with a file made 0600 from its first byte. The text is plain,
// so the file's permissions are the protection.
//
// A host may choose the desktop's Secret Service instead (SetStore), whose
// library is loaded at run time on first use. Then writes go there, and a
// copy of the entry in the file store is removed once the write succeeded,
// so that no stale token stays readable beside it. Reads ask the Secret
// Service first and fall back to the file store when it has no entry or
// cannot be reached, so nobody is signed out by the change. Removals clear
// both. Nothing ever prompts: a locked collection or item counts as
// unreachable. Reasons go to the trace, never a password.
//
// Any thread may call at once: one process-wide mutex orders the calls.
// Writers in two processes at once are not coordinated; the last one wins.
// Nothing throws: failures show in the return values.

#include <string>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace security {

enum KeychainStore { KeychainStore_File, KeychainStore_System };

class Keychain {
public:
    // Where passwords go from now on, process-wide; the file store until set.
    static void SetStore(KeychainStore store);
    static KeychainStore GetStore();
    // Whether the Secret Service can take a password now without prompting;
    // if not, `reason` says why (no library, no service, locked collection).
    static bool SystemStoreUsable(std::string& reason);

    // Stores or replaces the password of (domain, account). Gives false if the
    // store could not be written (with the Secret Service chosen: if it could
    // not take the password; the file store is then left as it was), or exists and could not be read (rewriting
    // it then would lose the other entries). Entries of a damaged store that
    // can still be read are kept; the unreadable ones are dropped.
    static bool SetPassword(const UTF16String& domain, const UTF16String& account, const UTF16String& password);
    // The stored password, or empty text if there is none or the store cannot
    // be read.
    static UTF16String GetPassword(const UTF16String& domain, const UTF16String& account);
    // Removes the entry. Gives true if it is gone afterwards (also when there
    // was none), false if the store could not be read or written; with the
    // Secret Service chosen, from both stores.
    static bool RemovePassword(const UTF16String& domain, const UTF16String& account);
};

}  // namespace security

// Also reachable as tolmocore::Keychain.
using security::Keychain;
using security::KeychainStore;
using security::KeychainStore_File;
using security::KeychainStore_System;

}  // namespace tolmocore
