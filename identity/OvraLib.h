#pragma once
// The native identity library: not linked, but looked for at run time and its
// C functions taken by name. GetOvraLib loads it once per process and keeps it
// loaded until exit; nothing here ever unloads it or reports a failure to load.
//
// This header holds only types and three declarations, so that a stand-in of
// the native library can check its exports against the same signatures.

#include <cstdint>
#include <string>

extern "C" {

// 0 is success; the bridge tells no other value apart.
typedef std::int32_t OVRA_STATUS;

// The library's completion callback. `context` is the pointer given to
// OVRA_createRef for the handle the call was made on. Text is NUL-terminated
// UTF-8 and lives only for the call. The library may call on a thread of its own.
typedef void (*OVRA_CompletionCallback)(OVRA_STATUS status, const char* text, void* context);

// An opaque handle of the library.
typedef void* OVRA_Ref;

typedef OVRA_Ref (*OVRA_createRef_Function)(void* context, bool production);
// Taken from the library but never called: their arguments do not matter here.
typedef void (*OVRA_UnusedFunction)(void);
typedef OVRA_STATUS (*OVRA_fetchDefaultUserInfoForClientId_Function)(OVRA_Ref ref, const char* clientID,
                                                                     char** userInfo);
typedef OVRA_STATUS (*OVRA_fetchAccessToken_Function)(OVRA_Ref ref, const char* clientID, const char* clientSecret,
                                                      const char* userID, const char* reserved, const char* scope,
                                                      OVRA_CompletionCallback callback);
typedef OVRA_STATUS (*OVRA_fetchContinueToken_Function)(OVRA_Ref ref, const char* accessToken, const char* target,
                                                        const char* url, const char* scope, const char* responseType,
                                                        const char* argument, OVRA_CompletionCallback callback);
typedef OVRA_STATUS (*OVRA_getDeviceID_Function)(OVRA_Ref ref, char** deviceID);
typedef OVRA_STATUS (*OVRA_revokeDeviceToken_Function)(OVRA_Ref ref, const char* first, const char* second,
                                                       const char* third, OVRA_CompletionCallback callback);
typedef OVRA_STATUS (*OVRA_fetchAccounts_Function)(OVRA_Ref ref, const char* argument, char** accounts);
typedef OVRA_STATUS (*OVRA_fetchIDPResponseForKey_Function)(OVRA_Ref ref, const char* arguments,
                                                            OVRA_CompletionCallback callback);

}  // extern "C"

namespace tolmonetsync {

// What the bridge answers itself, without the library, when the library or
// one of its functions is missing.
const OVRA_STATUS kOVRA_STATUS_Unavailable = -1;

// The library as the bridge sees it. Every pointer is null when the library
// could not be loaded; one that the library does not export stays null alone.
struct OvraLibWrapper {
    OVRA_createRef_Function mCreateRef = nullptr;
    OVRA_UnusedFunction mCreateRefEx = nullptr;
    OVRA_UnusedFunction mReleaseRef = nullptr;
    OVRA_fetchDefaultUserInfoForClientId_Function mFetchDefaultUserInfoForClientId = nullptr;
    OVRA_fetchAccessToken_Function mFetchAccessToken = nullptr;
    OVRA_fetchContinueToken_Function mFetchContinueToken = nullptr;
    OVRA_getDeviceID_Function mGetDeviceID = nullptr;
    OVRA_revokeDeviceToken_Function mRevokeDeviceToken = nullptr;
    OVRA_fetchAccounts_Function mFetchAccounts = nullptr;
    OVRA_UnusedFunction mReleaseData = nullptr;
    OVRA_fetchIDPResponseForKey_Function mFetchIDPResponseForKey = nullptr;
    void* mLibrary = nullptr;  // what dlopen gave

    bool IsAvailable() const { return mCreateRef != nullptr; }
};

// A path for the native library that overrides the default location
// (Dir::AppDir()/Frameworks/OvraLib.dylib). Empty at load; OvraConnection's
// constructor with a path sets it if it is still empty. Read once, by the
// first GetOvraLib.
extern std::string sRecommendedOvraPath;

// Loads the library on the first call, on whichever thread makes it, under a
// once-only guard; later calls give the same wrapper. Never throws.
const OvraLibWrapper& GetOvraLib();

// Sets sRecommendedOvraPath to `path` if it is empty; any thread.
void RecommendOvraPathIfUnset(const std::string& path);

}  // namespace tolmonetsync
