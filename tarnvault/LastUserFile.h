#pragma once
// The text of the last-user file, "tarnvaultuser.txt" in the preference
// directory: one JSON object whose "mUserID" string names the last user who
// signed in. It holds no token. Apart from the credentials' file and keychain
// work so that a fuzzer can reach the parser.
//
// Pure functions of their arguments; any thread.

#include "foundation/core/Strings.h"

namespace tolmonetsync {
namespace tarnvault {

// The user identifier the text holds, empty when the object has no
// "mUserID". Throws a std::exception (Boost's JSON and any_cast errors among
// them) for text that is not JSON, not an object, or whose "mUserID" is no
// string.
UTF8String ParseLastUserText(const UTF8String& text);

// The text of the file for that user, as the credentials write it.
UTF8String FormatLastUserText(const UTF8String& userID);

}  // namespace tarnvault
}  // namespace tolmonetsync
