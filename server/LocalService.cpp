#include "server/LocalService.h"

#include <atomic>
#include <chrono>
#include <memory>
#include <stdexcept>

#include "server/Accounts.h"
#include "server/AssetJson.h"
#include "server/AssetRoutes.h"
#include "server/AssetStore.h"
#include "server/ConnectionQueue.h"
#include "server/ContentFiles.h"
#include "server/DataDirectoryLock.h"
#include "server/Database.h"
#include "server/GracefulServer.h"
#include "server/IdentityRoutes.h"
#include "server/InternalError.h"
#include "server/Router.h"
#include "server/Sessions.h"
#include "server/SignInThrottle.h"

namespace tolmonetsync {
namespace server {

namespace {

const char kBearer[] = "Bearer ";
const std::size_t kMidBodySize = 4096;

std::string BearerToken(const httplib::Request& request)
{
    const std::string value = request.get_header_value("Authorization");
    if (value.compare(0, sizeof(kBearer) - 1, kBearer) != 0) return std::string();
    return value.substr(sizeof(kBearer) - 1);
}

}  // namespace

LocalService::LocalService(const LocalServiceOptions& options) : mOptions(options)
{
    if (mOptions.mDataDirectory.empty()) throw std::runtime_error("the service needs a data directory");
    // Before anything sweeps: another service's uncommitted content looks unreferenced.
    mLock = std::make_unique<DataDirectoryLock>(mOptions.mDataDirectory);
    mContent = std::make_unique<ContentFiles>(mOptions.mDataDirectory);
    mDatabase = std::make_unique<Database>(mOptions.mDataDirectory + "/service.sqlite3",
                                           static_cast<std::size_t>(mOptions.mWorkers));
    mAccounts = std::make_unique<Accounts>(*mDatabase);
    mAssets = std::make_unique<AssetStore>(*mDatabase, *mContent);
    mRouter = std::make_unique<Router>(AssetRoutes());
    mSessions = std::make_unique<Sessions>(*mDatabase, *mAccounts, mOptions.mTokenTtlSeconds);
    mThrottle = std::make_unique<SignInThrottle>(mOptions.mSignInDelays);
    mIdentityRouter =
        std::make_unique<Router>(IdentityRoutes(*mSessions, *mAccounts, *mThrottle, mOptions.mDeniedUsers));
    mGate = std::make_unique<BodyGate>(
        *mContent, mOptions.mMaxUploadBytes, [this](const httplib::Request& request) { return Admit(request); },
        [this](const httplib::Request& request, httplib::Response& response, const Admission& admission,
               ContentFiles::Incoming* upload) { Answer(request, response, admission, upload); });
    mAssets->RemoveUnreferencedContent();
    for (const ServiceUser& user : mOptions.mUsers) mAccounts->SetUser(user.mName, user.mPassword, user.mEmail);
    for (const ServiceToken& token : mOptions.mTokens) {
        mAccounts->GrantToken(token.mUser, token.mToken, mOptions.mTokenTtlSeconds);
    }
}

LocalService::~LocalService()
{
    Stop();
}

void LocalService::Start()
{
    if (mServer) throw std::runtime_error("the service is running already");
    std::unique_ptr<httplib::Server> server;
    if (Secure()) {
        auto secure =
            std::make_unique<GracefulSslServer>(mOptions.mCertificateFile.c_str(), mOptions.mPrivateKeyFile.c_str());
        if (!secure->is_valid())
            throw std::runtime_error("cannot serve HTTPS with the certificate " + mOptions.mCertificateFile +
                                     " and the key " + mOptions.mPrivateKeyFile);
        server = std::move(secure);
    } else {
        server = std::make_unique<GracefulServer>();
    }
    const auto workers = static_cast<std::size_t>(mOptions.mWorkers);
    const auto maxConnections = static_cast<std::size_t>(mOptions.mMaxConnections);
    server->new_task_queue = [workers, maxConnections] { return new ConnectionQueue(workers, maxConnections); };
    // A client that stops sending or reading loses its connection.
    server->set_read_timeout(mOptions.mReadTimeoutSeconds);
    server->set_write_timeout(mOptions.mWriteTimeoutSeconds);
    server->set_exception_handler(AnswerEscapedException);
    server->set_keep_alive_max_count(100000);
    // Answers go out in several writes (headers, then body): without this the
    // second write waits for the client's delayed acknowledgement, 40 ms a request.
    server->set_tcp_nodelay(true);
    // An idle kept-alive connection holds a worker; let it go after a second
    // (a client reconnects on loopback at once), so that many idle clients
    // never starve busy ones and a stop never waits long for one.
    server->set_keep_alive_timeout(1);
    mGate->Install(*server);
    // Every answer says when it left, as HTTP servers with a clock do: clients
    // compare it with their own.
    server->set_post_routing_handler([](const httplib::Request&, httplib::Response& response) {
        const auto now = std::chrono::system_clock::now().time_since_epoch();
        response.set_header("Date", HttpDate(std::chrono::duration_cast<std::chrono::microseconds>(now).count()));
    });
    int port = mOptions.mPort;
    if (port == 0) {
        port = server->bind_to_any_port(mOptions.mHost.c_str());
    } else if (!server->bind_to_port(mOptions.mHost.c_str(), port)) {
        port = -1;
    }
    if (port <= 0)
        throw std::runtime_error("cannot listen on " + mOptions.mHost + ":" + std::to_string(mOptions.mPort));
    mPort = port;
    mServer = std::move(server);
    httplib::Server* raw = mServer.get();
    auto ended = std::make_shared<std::atomic<bool> >(false);
    mThread = std::thread([raw, ended] {
        raw->listen_after_bind();
        *ended = true;
    });
    // A stop before the accept loop runs would be lost, and the join would hang.
    while (!raw->is_running() && !*ended) std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

void LocalService::Stop()
{
    if (!mServer) return;
    mServer->stop();
    if (mThread.joinable()) mThread.join();
    mServer.reset();
}

bool LocalService::Secure() const
{
    return !mOptions.mCertificateFile.empty() || !mOptions.mPrivateKeyFile.empty();
}

int LocalService::Port() const
{
    return mPort;
}

std::string LocalService::AssetServiceUrl() const
{
    return (Secure() ? "https://" : "http://") + mOptions.mHost + ":" + std::to_string(mPort) + "/api";
}

std::string LocalService::IdentityServiceUrl() const
{
    return (Secure() ? "https://" : "http://") + mOptions.mHost + ":" + std::to_string(mPort) + "/ovra";
}

void LocalService::SetAnswerStyle(const AnswerStyle& style)
{
    std::lock_guard<std::mutex> lock(mStyleMutex);
    mStyle = style;
}

AnswerStyle LocalService::GetAnswerStyle() const
{
    std::lock_guard<std::mutex> lock(mStyleMutex);
    return mStyle;
}

Admission LocalService::Admit(const httplib::Request& request) const
{
    // The identity service has its own sign-in.
    if (request.path.compare(0, 6, "/ovra/") == 0) return Admission();
    if (request.path.compare(0, 5, "/api/") != 0 && request.path != "/api") {
        return Admission{404, "no such resource " + request.path, 0};
    }
    const boost::optional<std::int64_t> user = mAccounts->UserForToken(BearerToken(request));
    if (!user) return Admission{401, "missing or unknown access token", 0};
    return Admission{0, std::string(), *user};
}

void LocalService::Answer(const httplib::Request& request, httplib::Response& response, const Admission& admission,
                          ContentFiles::Incoming* upload)
{
    // Faults apply once the body is read, so an answer never leaves unread
    // bytes on a kept-alive connection.
    const std::size_t question = request.target.find('?');
    const std::string query = question == std::string::npos ? std::string() : request.target.substr(question + 1);
    const boost::optional<FaultRule> fault = mFaults.Match(request.method, request.path, query);
    if (fault && ApplyFault(*fault, request, response)) return;
    Serve(request, response, admission.mUser, upload);
}

void LocalService::Serve(const httplib::Request& request, httplib::Response& response, std::int64_t user,
                         ContentFiles::Incoming* upload)
{
    Exchange exchange{request, response, {}, user, GetAnswerStyle(), *mAssets, mPort, upload};
    try {
        if (request.path.compare(0, 6, "/ovra/") == 0) {
            mIdentityRouter->Dispatch(exchange);
        } else {
            mRouter->Dispatch(exchange);
        }
    } catch (const StoreFailure& failure) {
        exchange.Text(failure.Status(), failure.what());
    } catch (const std::exception& failure) {
        AnswerInternalError(request, response, failure.what());
    }
}

bool LocalService::ApplyFault(const FaultRule& rule, const httplib::Request& request, httplib::Response& response)
{
    switch (rule.mAction) {
        case FaultAction_Status:
            response.status = rule.mStatus;
            response.set_content(OneLine(rule.mBody), "text/plain; charset=utf-8");
            return true;
        case FaultAction_Delay:
            std::this_thread::sleep_for(rule.mDelay);
            return false;
        case FaultAction_CloseBeforeAnswer:
            DropConnection(mPort, request.remote_port);
            response.status = 500;
            return true;
        case FaultAction_CloseMidBody:
            response.status = 200;
            response.set_content_provider(kMidBodySize, "application/json",
                                          [](size_t offset, size_t, httplib::DataSink& sink) {
                                              if (offset > 0) return false;  // half is all it gets
                                              const std::string half(kMidBodySize / 2, ' ');
                                              sink.write(half.data(), half.size());
                                              return true;
                                          });
            return true;
        case FaultAction_NotJson:
            response.status = 200;
            response.set_content("<html>this is not JSON</html>", "application/json");
            return true;
        case FaultAction_WrongShapeJson:
            // An array of an object with a numeric "type": no asset and no list of assets reads it.
            response.status = 200;
            response.set_content("[{\"type\": 5}]", "application/json");
            return true;
    }
    return false;
}

}  // namespace server
}  // namespace tolmonetsync
