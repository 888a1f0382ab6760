#include "identity/OvraConnection.h"

#include <exception>

#include "foundation/core/Opener.h"
#include "foundation/core/Trace.h"
#include "identity/OvraAuth.h"
#include "identity/OvraResponse.h"

namespace tolmonetsync {

const ImmutableString kJumpToURLScope = ImmutableString::CreateStatic("openid,pellucid");
const ImmutableString kDefaultScope = ImmutableString::CreateStatic("openid,HalvaneID,pellucid");

namespace {

// Every use of the completion mutex carries the same label, whichever
// operation takes it.
const char kCompletionMutexLabel[] =
    "bool tolmonetsync::OvraConnection::StoreCompletionFunction(const OvraAsyncCompletionFunction &)";

class CompletionLock {
public:
    explicit CompletionLock(const tolmocore::threads::RecursiveMutex& mutex) : mMutex(mutex)
    {
        mMutex.Lock(kCompletionMutexLabel);
    }
    ~CompletionLock() { mMutex.Unlock(); }
    CompletionLock(const CompletionLock&) = delete;
    CompletionLock& operator=(const CompletionLock&) = delete;

private:
    const tolmocore::threads::RecursiveMutex& mMutex;
};

// The text between "<UserID>" and the "</UserID>" behind it; empty if
// either is missing.
UTF8String UserFromInfo(const char* info)
{
    const std::string text = info != nullptr ? info : "";
    const std::string open = "<UserID>";
    const std::size_t start = text.find(open);
    if (start == std::string::npos) return UTF8String();
    const std::size_t from = start + open.size();
    const std::size_t end = text.find("</UserID>", from);
    if (end == std::string::npos) return UTF8String();
    return UTF8String(text.substr(from, end - from));
}

const UTF8String& OrDefault(const UTF8String& value, const UTF8String& fallback)
{
    return value.empty() ? fallback : value;
}

}  // namespace

OvraConnection::OvraConnection() = default;

OvraConnection::OvraConnection(const std::string& libraryPath)
{
    RecommendOvraPathIfUnset(libraryPath);
}

OvraConnection::~OvraConnection()
{
    // A handle made with the context is never released, so the library may
    // still call back with the context after this object is gone: the block
    // is left behind on purpose (its weak pointer then finds nothing). Only a
    // context no handle ever got is freed.
    if (mRef == nullptr) delete mContext;
}

UTF8String OvraConnection::InitializeDeviceID()
{
    const OvraLibWrapper& lib = GetOvraLib();
    if (!lib.IsAvailable() || lib.mGetDeviceID == nullptr) return UTF8String();
    // This handle is not released either: the library owns it until exit.
    const OVRA_Ref ref = lib.mCreateRef(nullptr, true);
    if (ref == nullptr) return UTF8String();
    char* text = nullptr;
    if (lib.mGetDeviceID(ref, &text) != 0) return UTF8String();
    return UTF8String(text);
}

UTF8String OvraConnection::GetDeviceID() const
{
    static const UTF8String* sDeviceID = nullptr;  // never destroyed: read until exit
    static std::once_flag sOnce;
    std::call_once(sOnce, [] { sDeviceID = new UTF8String(InitializeDeviceID()); });
    return *sDeviceID;
}

OVRA_Ref OvraConnection::InitializeOvraRefIfNecessary(bool production)
{
    std::lock_guard<std::mutex> lock(mStateMutex);
    if (mContext == nullptr) mContext = new Context(shared_from_this());
    if (mRef == nullptr) {
        const OvraLibWrapper& lib = GetOvraLib();
        if (lib.IsAvailable()) mRef = lib.mCreateRef(mContext, production);
    }
    return mRef;
}

bool OvraConnection::StoreCompletionFunction(const OvraAsyncCompletionFunction& newCompletion)
{
    CompletionLock lock(mCompletionMutex);
    if (!completion.empty()) return false;
    completion = newCompletion;
    return true;
}

void OvraConnection::ClearCompletionFunction()
{
    CompletionLock lock(mCompletionMutex);
    completion.clear();
}

void OvraConnection::AsyncCompletion(OVRA_STATUS status, const char* text)
{
    OvraAsyncCompletionFunction pending;
    {
        CompletionLock lock(mCompletionMutex);
        pending.swap(completion);
    }
    // Outside the lock, so that the completion may start the next operation.
    if (!pending.empty()) pending(status, text);
}

void OvraConnection::AsyncCompletion_WeakToStrong(OVRA_STATUS status, const char* text, void* context)
{
    if (context == nullptr) return;
    try {
        const boost::shared_ptr<OvraConnection> self = static_cast<Context*>(context)->lock();
        if (self) self->AsyncCompletion(status, text);
    } catch (const std::exception& e) {
        TOLMO_TRACE("OvraConnection", 1, "AsyncCompletion error: " << e.what());
    } catch (...) {
        // The library's thread must never unwind through its own C frames.
        TOLMO_TRACE("OvraConnection", 1, "AsyncCompletion error: unknown exception");
    }
}

bool OvraConnection::StartAsync(bool production, const OvraAsyncCompletionFunction& newCompletion,
                                const boost::function<OVRA_STATUS(OVRA_Ref)>& call)
{
    const OVRA_Ref ref = InitializeOvraRefIfNecessary(production);
    if (!StoreCompletionFunction(newCompletion)) return false;
    const OVRA_STATUS status = ref != nullptr ? call(ref) : kOVRA_STATUS_Unavailable;
    if (status == 0) return true;
    ClearCompletionFunction();
    return false;
}

bool OvraConnection::AsyncFetchAccessToken(bool production, const UTF8String& user, const UTF8String& clientID,
                                           const UTF8String& clientSecret, const UTF8String& scope,
                                           const OvraAsyncCompletionFunction& newCompletion)
{
    return StartAsync(production, newCompletion, [&](OVRA_Ref ref) {
        const OvraLibWrapper& lib = GetOvraLib();
        if (lib.mFetchAccessToken == nullptr) return kOVRA_STATUS_Unavailable;
        return lib.mFetchAccessToken(ref, clientID.Chars(), clientSecret.Chars(), user.Chars(), "", scope.Chars(),
                                     &OvraConnection::AsyncCompletion_WeakToStrong);
    });
}

bool OvraConnection::AsyncRegisterDeviceToken(bool production, const UTF8String& clientID,
                                              const UTF8String& clientSecret, const UTF8String& scope,
                                              const UTF8String& deviceToken,
                                              const OvraAsyncCompletionFunction& newCompletion)
{
    // The library reads this as markup of its own; values go in unescaped.
    oUTF8StringStream stream;
    stream << "<pwaArgs>"
           << "<clientId>" << clientID << "</clientId>"
           << "<clientSecret>" << clientSecret << "</clientSecret>"
           << "<deviceToken>" << deviceToken << "</deviceToken>"
           << "<scope>" << scope << "</scope>"
           << "<deviceId>" << GetDeviceID() << "</deviceId>"
           << "<fennickId></fennickId>"
           << "<callerId></callerId>"
           << "</pwaArgs>";
    const UTF8String arguments = stream.GetString();
    return StartAsync(production, newCompletion, [&](OVRA_Ref ref) {
        const OvraLibWrapper& lib = GetOvraLib();
        if (lib.mFetchIDPResponseForKey == nullptr) return kOVRA_STATUS_Unavailable;
        return lib.mFetchIDPResponseForKey(ref, arguments.Chars(), &OvraConnection::AsyncCompletion_WeakToStrong);
    });
}

bool OvraConnection::AsyncRevokeDeviceToken(bool production, const UTF8String& first, const UTF8String& second,
                                            const UTF8String& third, const OvraAsyncCompletionFunction& newCompletion)
{
    return StartAsync(production, newCompletion, [&](OVRA_Ref ref) {
        const OvraLibWrapper& lib = GetOvraLib();
        if (lib.mRevokeDeviceToken == nullptr) return kOVRA_STATUS_Unavailable;
        return lib.mRevokeDeviceToken(ref, first.Chars(), second.Chars(), third.Chars(),
                                      &OvraConnection::AsyncCompletion_WeakToStrong);
    });
}

OVRA_STATUS OvraConnection::RevokeDeviceToken(bool production, const char* first, const char* second, const char* third,
                                              OVRA_CompletionCallback callback)
{
    const OVRA_Ref ref = InitializeOvraRefIfNecessary(production);
    const OvraLibWrapper& lib = GetOvraLib();
    if (ref == nullptr || lib.mRevokeDeviceToken == nullptr) return kOVRA_STATUS_Unavailable;
    return lib.mRevokeDeviceToken(ref, first, second, third, callback);
}

bool OvraConnection::GetUserInfoAndFetchToken(bool production, const UTF8String& user, const UTF8String& clientID,
                                              const UTF8String& clientSecret, const UTF8String& scope)
{
    const UTF8String id = OrDefault(clientID, kTOLMO_OVRA_CLIENT_ID.ToUTF8String());
    const UTF8String secret = OrDefault(
        clientSecret, (production ? kTOLMO_OVRA_CLIENT_SECRET_GM : kTOLMO_OVRA_CLIENT_SECRET_STAGE).ToUTF8String());
    const UTF8String scopes = OrDefault(scope, kDefaultScope.ToUTF8String());

    fetchState = kFetchState_Fetching;
    const OVRA_Ref ref = InitializeOvraRefIfNecessary(production);
    const OvraLibWrapper& lib = GetOvraLib();
    // Without a handle there is nothing to fetch with, named user or not.
    if (ref == nullptr) {
        TOLMO_TRACE("OvraConnection", 1, "GetUserInfoAndFetchToken: the native library is not available");
        fetchState.store(kFetchState_NotStarted, std::memory_order_release);
        return false;
    }
    UTF8String fetchedUser = user;
    if (fetchedUser.empty()) {
        char* info = nullptr;
        if (lib.mFetchDefaultUserInfoForClientId == nullptr ||
            lib.mFetchDefaultUserInfoForClientId(ref, id.Chars(), &info) != 0) {
            TOLMO_TRACE("OvraConnection", 1, "GetUserInfoAndFetchToken: no default user");
            fetchState.store(kFetchState_NotStarted, std::memory_order_release);
            return false;
        }
        fetchedUser = UserFromInfo(info);
    }
    {
        std::lock_guard<std::mutex> lock(mStateMutex);
        userID = fetchedUser;
    }
    if (lib.mFetchAccessToken == nullptr) {
        fetchState.store(kFetchState_NotStarted, std::memory_order_release);
        return false;
    }
    // A refusal here leaves the state at "under way", as the library left it.
    return lib.mFetchAccessToken(ref, id.Chars(), secret.Chars(), fetchedUser.Chars(), "", scopes.Chars(),
                                 &FetchTokenCallback) == 0;
}

void OvraConnection::ParseAccessTokenDetails(const char* text, bool success)
{
    if (!success) {
        fetchState.store(kFetchState_Failed, std::memory_order_release);
        return;
    }
    try {
        OvraResponse response;
        OvraDeserializeResponse(UTF8String(text), response);
        {
            std::lock_guard<std::mutex> lock(mStateMutex);
            accessToken = response.access_token;
            email = response.email;
        }
        fetchState.store(kFetchState_Received, std::memory_order_release);
    } catch (const std::exception& e) {
        TOLMO_TRACE("OvraConnection", 1, "ParseAccessTokenDetails error: " << e.what());
    }
}

bool OvraConnection::JumpToURL(const ImmutableString& url, const UTF8String& argument)
{
    const OvraLibWrapper& lib = GetOvraLib();
    OVRA_Ref ref;
    UTF8String token;
    {
        std::lock_guard<std::mutex> lock(mStateMutex);
        ref = mRef;
        token = accessToken;
    }
    if (ref == nullptr || lib.mFetchContinueToken == nullptr) return false;
    return lib.mFetchContinueToken(ref, token.Chars(), "PellucidJump", url.c_str(), kJumpToURLScope.c_str(), "token",
                                   argument.Chars(), &FetchContinueTokenCallback) == 0;
}

UTF8String OvraConnection::FetchAccounts(bool production, const UTF8String& argument)
{
    const OVRA_Ref ref = InitializeOvraRefIfNecessary(production);
    const OvraLibWrapper& lib = GetOvraLib();
    if (ref == nullptr || lib.mFetchAccounts == nullptr) return UTF8String();
    char* text = nullptr;
    if (lib.mFetchAccounts(ref, argument.Chars(), &text) != 0 || text == nullptr) return UTF8String();
    return UTF8String(text);
}

UTF8String OvraConnection::GetUserID() const
{
    std::lock_guard<std::mutex> lock(mStateMutex);
    return userID;
}

UTF8String OvraConnection::GetEmail() const
{
    std::lock_guard<std::mutex> lock(mStateMutex);
    return email;
}

UTF8String OvraConnection::GetAccessToken() const
{
    std::lock_guard<std::mutex> lock(mStateMutex);
    return accessToken;
}

void FetchTokenCallback(OVRA_STATUS status, const char* text, void* context)
{
    if (context == nullptr) return;
    try {
        const boost::shared_ptr<OvraConnection> self = static_cast<OvraConnection::Context*>(context)->lock();
        if (self) self->ParseAccessTokenDetails(text, status == 0);
    } catch (...) {
        // Called from C: nothing may unwind out of here.
        TOLMO_TRACE("OvraConnection", 1, "FetchTokenCallback error");
    }
}

void FetchContinueTokenCallback(OVRA_STATUS status, const char* text, void* context)
{
    if (context == nullptr || status != 0) return;
    try {
        const boost::shared_ptr<OvraConnection> self = static_cast<OvraConnection::Context*>(context)->lock();
        if (!self) return;
        OvraResponse response;
        OvraDeserializeResponse(UTF8String(text), response);
        if (!response.jump.empty())
            tolmocore::utility::OpenURLInDefaultBrowser(tolmocore::utility::UTF8to16(response.jump));
    } catch (const std::exception& e) {
        TOLMO_TRACE("OvraConnection", 1, "FetchContinueTokenCallback error: " << e.what());
    } catch (...) {
        TOLMO_TRACE("OvraConnection", 1, "FetchContinueTokenCallback error: unknown exception");
    }
}

}  // namespace tolmonetsync
