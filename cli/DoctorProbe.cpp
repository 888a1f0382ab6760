#include "cli/DoctorProbe.h"

#include <chrono>
#include <condition_variable>
#include <ctime>
#include <fstream>
#include <memory>
#include <mutex>

#include "cli/PrintableName.h"
#include "cli/SignInCommands.h"
#include "foundation/core/Dir.h"
#include "foundation/core/Keychain.h"
#include "foundation/net/QuoteURL.h"
#include "foundation/net/RequestProcessor.h"
#include "tarnvault/LastUserFile.h"

namespace tolmonetsync {
namespace cli {

namespace {

using tolmocore::utility::ToNarrow;
using Clock = std::chrono::system_clock;

struct ProbeAnswer {
    std::mutex mMutex;
    std::condition_variable mCame;
    bool mDone = false;
    boost::shared_ptr<tolmonet::Response> mResponse;
};

bool Mentions(const std::string& text, const char* part)
{
    return text.find(part) != std::string::npos;
}

// What the answer (or the lack of one) says about the sign-in and the service.
DoctorFinding ClassifyAnswer(const tolmonet::Response& answer, const std::string& url, bool withToken)
{
    const std::string body = answer.BodyText().ToStdString();
    const std::string where = PrintableName(url);
    if (answer.status >= 200 && answer.status <= 299)
        return {"service", false, where + " accepts the sign-in (HTTP " + std::to_string(answer.status) + ")"};
    if (answer.status == 401)
        return {"service", withToken,
                withToken ? where +
                                " refuses the token (HTTP 401): it expired or was withdrawn; run "
                                "'tolmonetsync login' again"
                          : where + " answers, and asks for a sign-in (HTTP 401)"};
    if (answer.status >= 500)
        return {"service", true, where + " failed (HTTP " + std::to_string(answer.status) + "): try again later"};
    if (answer.status == tolmonet::kStatusNoResponse) {
        if (Mentions(body, "SSL") || Mentions(body, "TLS") || Mentions(body, "certificate"))
            return {"service", true,
                    "TLS failure at " + where + ": " + PrintableName(body) +
                        " (a service with its own certificate needs --ca-file)"};
        if (Mentions(body, "refused") || Mentions(body, "Could not connect"))
            return {"service", true,
                    "connection refused at " + where + ": " + PrintableName(body) +
                        " (is the service running? check --server)"};
        return {"service", true, "no answer from " + where + ": " + PrintableName(body)};
    }
    return {"service", true, where + " answered HTTP " + std::to_string(answer.status) + ": " + PrintableName(body)};
}

// An HTTP date ("Thu, 26 Nov 2026 02:10:38 GMT") as seconds since 1970; false
// for any other text.
bool ParseHttpDate(const std::string& text, std::time_t& seconds)
{
    std::tm parts{};
    const char* end = ::strptime(text.c_str(), "%a, %d %b %Y %H:%M:%S GMT", &parts);
    if (end == nullptr || *end != '\0') return false;
    seconds = ::timegm(&parts);
    return true;
}

DoctorFinding ClockFinding(const tolmonet::Response& answer, Clock::time_point sent, Clock::time_point received)
{
    const ImmutableString* date = tolmonet::FindHeader(answer.headers, ImmutableString::CreateStatic("DATE"));
    if (answer.status == tolmonet::kStatusNoResponse) return {"clock", false, "not measured: no answer"};
    std::time_t server = 0;
    if (date == nullptr || !ParseHttpDate(date->ToStdString(), server))
        return {"clock", false, "unknown: the service sent no Date header"};
    // The service read its clock somewhere between sending and receiving.
    const auto middle = sent + (received - sent) / 2;
    const long offset = static_cast<long>(server - Clock::to_time_t(middle));
    const long size = offset < 0 ? -offset : offset;
    const std::string text = "this computer's clock is " + std::to_string(size) + " s " +
                             (offset > 0 ? "behind" : "ahead of") + " the service's";
    if (size > kClockToleranceSeconds)
        return {"clock", true, text + ": set it right, or dates of changes will mislead"};
    return {"clock", false, size == 0 ? "agrees with the service's to the second" : text};
}

}  // namespace

StoredSignIn CheckStoredSignIn()
{
    StoredSignIn stored;
    stored.mFinding.mCheck = "sign-in";
    const std::string path = ToNarrow(tolmocore::filesupport::Dir::PrefDir().FullPath()) + "/tarnvaultuser.txt";
    std::ifstream file(path, std::ios::binary);
    if (!file) {
        stored.mFinding = {"sign-in", true, "not signed in: run 'tolmonetsync login' or give a token"};
        return stored;
    }
    const std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    try {
        stored.mUser = tarnvault::ParseLastUserText(UTF8String(text)).ToStdString();
    } catch (const std::exception&) {
        stored.mFinding = {"sign-in", true,
                           "the last-user file " + PrintableName(path) + " does not parse: sign in again"};
        return stored;
    }
    if (stored.mUser.empty()) {
        stored.mFinding = {"sign-in", true, "the last-user file names nobody: sign in again"};
        return stored;
    }
    using tolmocore::security::Keychain;
    const UTF16String account = tolmocore::utility::ToUTF16(stored.mUser);
    stored.mAccessToken = ToNarrow(Keychain::GetPassword(OvraKeychainDomain(u"Access"), account));
    const bool refresh = !Keychain::GetPassword(OvraKeychainDomain(u"Refresh"), account).empty();
    const std::string who = PrintableName(stored.mUser);
    if (stored.mAccessToken.empty() || !refresh) {
        stored.mFinding = {"sign-in", true,
                           "the last-user file names " + who + " but the keychain holds no " +
                               (stored.mAccessToken.empty() ? "access" : "refresh") + " token for them: sign in again"};
        return stored;
    }
    stored.mFinding = {"sign-in", false, "stored for " + who + "; the keychain and the last-user file agree"};
    return stored;
}

std::vector<DoctorFinding> ProbeService(const std::string& serviceUrl, const std::string& clientId,
                                        const std::string& token)
{
    tolmonet::FormList pairs;
    pairs.push_back(std::make_pair(ImmutableString::CreateStatic("name"), UTF8String(clientId)));
    const std::string url = serviceUrl + "/collections?" + tolmonet::QuoteURL(pairs).ToStdString();
    tolmonet::HeaderList headers;
    if (!token.empty())
        headers.insert(std::make_pair(ImmutableString::CreateStatic("Authorization"),
                                      ImmutableString::CreateDynamic("Bearer " + token)));
    const auto answer = std::make_shared<ProbeAnswer>();
    const Clock::time_point sent = Clock::now();
    const bool taken = tolmonet::http::GetGlobalRequestProcessor()->GET(
        Guid::CreateUnique(),
        [answer](const Guid&, const boost::shared_ptr<tolmonet::Response>& response) {
            std::lock_guard<std::mutex> lock(answer->mMutex);
            answer->mResponse = response;
            answer->mDone = true;
            answer->mCame.notify_all();
        },
        ImmutableString::CreateDynamic(url), headers, tolmonet::Configuration());
    if (!taken)
        return {{"service", true, "the request to " + PrintableName(serviceUrl) + " could not be sent"},
                {"clock", false, "not measured: no answer"}};
    std::unique_lock<std::mutex> lock(answer->mMutex);
    answer->mCame.wait(lock, [&] { return answer->mDone; });
    const Clock::time_point received = Clock::now();
    return {ClassifyAnswer(*answer->mResponse, serviceUrl, !token.empty()),
            ClockFinding(*answer->mResponse, sent, received)};
}

}  // namespace cli
}  // namespace tolmonetsync
