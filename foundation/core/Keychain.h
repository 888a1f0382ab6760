#pragma once
// Passwords kept for the user between runs.
//
// On Linux the store is the file "keychain.store" in Dir::PrefDir(), readable
// by the user alone: it is made with mode 0600 and every rewrite replaces it
// atomically with a file made 0600 from its first byte. The text is plain,
// so the file's permissions are the protection.
//
// Any thread may call at once: one process-wide mutex orders the calls.
// Writers in two processes at once are not coordinated; the last one wins.
// Nothing throws: failures show in the return values.

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace security {

class Keychain {
public:
    // Stores or replaces the password of (domain, account). Gives false if the
    // store could not be written, or exists and could not be read (rewriting
    // it then would lose the other entries). Entries of a damaged store that
    // can still be read are kept; the unreadable ones are dropped.
    static bool SetPassword(const UTF16String& domain, const UTF16String& account, const UTF16String& password);
    // The stored password, or empty text if there is none or the store cannot
    // be read.
    static UTF16String GetPassword(const UTF16String& domain, const UTF16String& account);
    // Removes the entry. Gives true if it is gone afterwards (also when there
    // was none), false if the store could not be read or written.
    static bool RemovePassword(const UTF16String& domain, const UTF16String& account);
};

}  // namespace security

// Also reachable as tolmocore::Keychain.
using security::Keychain;

}  // namespace tolmocore
