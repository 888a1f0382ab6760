#pragma once
// Internal to Keychain: passwords in the desktop's Secret Service, reached
// through the secret library, which is opened at run time on first use and
// never linked, so that hosts keeping the file store load none of it.
//
// An entry is one item of the default collection with the attributes
// "domain" and "account". Nothing ever prompts: a locked item or a locked or
// missing default collection is an error, never unlocked.
//
// Every call blocks on the session bus. Callers order the calls (Keychain's
// mutex). Nothing throws; a failure leaves its reason in `error`, which
// names the step and the service's own words and never holds a password.

#include <string>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace security {
namespace detail {

enum SecretLookup { SecretLookup_Found, SecretLookup_Missing, SecretLookup_Failed };

// True if the default collection is there and unlocked, so that a store
// would succeed without a prompt.
bool SecretServiceUsable(std::string& error);

// Stores or replaces the entry.
bool SecretServiceStore(const UTF16String& domain, const UTF16String& account, const UTF16String& password,
                        std::string& error);

SecretLookup SecretServiceLookup(const UTF16String& domain, const UTF16String& account, UTF16String& password,
                                 std::string& error);

// True if no entry is left afterwards (also when there was none).
bool SecretServiceRemove(const UTF16String& domain, const UTF16String& account, std::string& error);

// Tests: the library file to open instead of the system's, so that a
// missing one can be met. Takes effect at the next call.
void SetSecretLibraryName(const std::string& name);

}  // namespace detail
}  // namespace security
}  // namespace tolmocore
