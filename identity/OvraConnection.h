#pragma once
// Sign-in through the native identity library (OvraLib.h): one handle on the
// library, its C callbacks turned into a callable held by this object, and the
// operations a host calls. Nothing else in the library uses this class.
//
// Ownership. Hold every OvraConnection in a boost::shared_ptr before its first
// native operation (that operation throws boost::bad_weak_ptr otherwise). The
// handle and its callback context are made on that first operation, and the
// handle is never released. An object destroyed while a call is pending is
// safe: the callback finds it gone and does nothing.
//
// Threads. Operations may be called from any thread, one at a time per object.
// The library calls back on a thread of its own; a completion runs there, with
// no lock of this object held, so it may start the next operation.
//
// The fetch state and the user's fields are public, as hosts read them by
// name. The library's thread writes userID, email and accessToken before it
// stores 2, 3 or 4 into fetchState (a release store). A host reads the three
// strings directly only after it has read one of those values from
// fetchState, and before it starts the next fetch; the getters below may be
// called at any time.
//
// Errors. Nothing here throws to the caller but boost::bad_weak_ptr (above)
// and allocation failures. A missing library, or a missing function of it,
// makes every operation fail: false, empty text, or kOVRA_STATUS_Unavailable.

#include <atomic>
#include <mutex>
#include <string>

#include <boost/enable_shared_from_this.hpp>
#include <boost/function.hpp>
#include <boost/noncopyable.hpp>
#include <boost/weak_ptr.hpp>

#include "foundation/core/ImmutableString.h"
#include "foundation/core/Strings.h"
#include "foundation/core/Threads.h"
#include "identity/OvraLib.h"

namespace tolmonetsync {

// The scope of a jump's continue token, and of a token fetch given no scope.
extern const ImmutableString kJumpToURLScope;  // "openid,pellucid"
extern const ImmutableString kDefaultScope;    // "openid,HalvaneID,pellucid"

// Receives the library's status and text (null or valid for the call only).
using OvraAsyncCompletionFunction = boost::function<void(OVRA_STATUS status, const char* text)>;

class OvraConnection : public boost::enable_shared_from_this<OvraConnection>, private boost::noncopyable {
public:
    // Progress of GetUserInfoAndFetchToken, as GetFetchState gives it.
    enum {
        kFetchState_None = 0,        // nothing fetched yet
        kFetchState_Fetching = 1,    // under way (also after a native call that refused at once)
        kFetchState_Received = 2,    // token and email stored
        kFetchState_Failed = 3,      // the library's callback reported a failure
        kFetchState_NotStarted = 4,  // no handle, no function, or the user lookup failed
    };

    OvraConnection();
    // As above; `libraryPath` becomes sRecommendedOvraPath if that is still
    // empty. It has no effect once a path was set or the library was loaded.
    explicit OvraConnection(const std::string& libraryPath);
    ~OvraConnection();

    // Asks the library for the device identifier afresh; empty on any failure.
    static UTF8String InitializeDeviceID();
    // The identifier asked for once per process; an empty first answer stays.
    UTF8String GetDeviceID() const;

    // `production` chooses the service's instance when the handle is made and
    // has no effect on an existing handle. Empty arguments take the built-in
    // client id, the instance's secret and kDefaultScope; an empty `userID`
    // takes the library's default user. True if the library took the fetch;
    // the outcome shows in GetFetchState (see the enum above).
    bool GetUserInfoAndFetchToken(bool production, const UTF8String& userID, const UTF8String& clientID,
                                  const UTF8String& clientSecret, const UTF8String& scope);

    // At most one of these three is pending per object. Each returns false,
    // with the library not called, while another is pending, and false if the
    // library refused at once; then `completion` is dropped. True means that
    // `completion` runs once later, on the library's thread, unless this
    // object is gone by then.
    bool AsyncFetchAccessToken(bool production, const UTF8String& userID, const UTF8String& clientID,
                               const UTF8String& clientSecret, const UTF8String& scope,
                               const OvraAsyncCompletionFunction& completion);
    // Hands the library "<pwaArgs>...</pwaArgs>" with every value as given,
    // unescaped, and the device identifier of GetDeviceID.
    bool AsyncRegisterDeviceToken(bool production, const UTF8String& clientID, const UTF8String& clientSecret,
                                  const UTF8String& scope, const UTF8String& deviceToken,
                                  const OvraAsyncCompletionFunction& completion);
    bool AsyncRevokeDeviceToken(bool production, const UTF8String& first, const UTF8String& second,
                                const UTF8String& third, const OvraAsyncCompletionFunction& completion);
    // Passes everything straight to the library, whose `callback` gets this
    // object's context block (see the source); no completion is stored.
    OVRA_STATUS RevokeDeviceToken(bool production, const char* first, const char* second, const char* third,
                                  OVRA_CompletionCallback callback);

    // Asks for a continue token for `url` with the last fetched access token
    // and opens the "jump" URL of the answer in the default browser. Needs the
    // handle of an earlier operation: false without one. True if the library
    // took the call; a failed or unreadable answer opens nothing.
    bool JumpToURL(const ImmutableString& url, const UTF8String& argument);
    // The library's text for `argument`; empty on any failure.
    UTF8String FetchAccounts(bool production, const UTF8String& argument);

    int GetFetchState() const { return fetchState.load(std::memory_order_acquire); }
    UTF8String GetUserID() const;
    UTF8String GetEmail() const;
    UTF8String GetAccessToken() const;

    // See "The fetch state and the user's fields" above: the strings are
    // written before the release store of 2, 3 or 4, and read after it.
    std::atomic<int> fetchState{kFetchState_None};
    UTF8String userID;
    UTF8String email;
    UTF8String accessToken;

private:
    using Context = boost::weak_ptr<OvraConnection>;

    // The handle of this object, made on first need; null if the library is
    // missing or refused. Throws boost::bad_weak_ptr if not held by a shared_ptr.
    OVRA_Ref InitializeOvraRefIfNecessary(bool production);
    bool StoreCompletionFunction(const OvraAsyncCompletionFunction& completion);
    void ClearCompletionFunction();
    void AsyncCompletion(OVRA_STATUS status, const char* text);
    void ParseAccessTokenDetails(const char* text, bool success);
    // Stores `completion`, makes the call, and drops the completion if the
    // call refused: the shape every asynchronous operation shares.
    bool StartAsync(bool production, const OvraAsyncCompletionFunction& completion,
                    const boost::function<OVRA_STATUS(OVRA_Ref)>& call);

    static void AsyncCompletion_WeakToStrong(OVRA_STATUS status, const char* text, void* context);
    friend void FetchTokenCallback(OVRA_STATUS status, const char* text, void* context);
    friend void FetchContinueTokenCallback(OVRA_STATUS status, const char* text, void* context);

    // mStateMutex guards mRef and mContext, and the writes of userID, email
    // and accessToken against this object's own readers (the getters and
    // JumpToURL), which may run while a fetch is under way.
    mutable std::mutex mStateMutex;
    OVRA_Ref mRef = nullptr;
    Context* mContext = nullptr;  // handed to OVRA_createRef
    // mCompletionMutex guards completion and nothing else.
    OvraAsyncCompletionFunction completion;
    tolmocore::threads::RecursiveMutex mCompletionMutex;
};

// The library's callbacks of a token fetch and of a jump; `context` is an
// OvraConnection's context block. Neither lets an exception out.
void FetchTokenCallback(OVRA_STATUS status, const char* text, void* context);
void FetchContinueTokenCallback(OVRA_STATUS status, const char* text, void* context);

}  // namespace tolmonetsync
