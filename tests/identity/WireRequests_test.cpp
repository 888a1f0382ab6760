// The identity calls as they reach the wire, read by a plain recording
// server rather than by the local service's lenient parser: method, path,
// query keys in their order, fixed values, quoting, content type and body.

#include <gtest/gtest.h>

#include <map>

#include "support/CallRecorder.h"
#include "support/IdentityService.h"
#include "support/LoopbackHttpServer.h"

namespace {

using namespace testsupport;
using namespace tolmonetsync;

struct Query {
    std::vector<std::string> mKeys;
    std::map<std::string, std::string> mRaw;
};

Query Split(const std::string& query)
{
    Query split;
    size_t start = 0;
    while (start <= query.size()) {
        const size_t end = std::min(query.find('&', start), query.size());
        const std::string field = query.substr(start, end - start);
        const size_t equals = field.find('=');
        split.mKeys.push_back(field.substr(0, equals));
        split.mRaw[split.mKeys.back()] = equals == std::string::npos ? "" : field.substr(equals + 1);
        start = end + 1;
    }
    return split;
}

std::string Unquote(const std::string& raw)
{
    std::string text;
    for (size_t i = 0; i < raw.size(); ++i) {
        if (raw[i] == '%' && i + 2 < raw.size()) {
            text += static_cast<char>(std::stoi(raw.substr(i + 1, 2), nullptr, 16));
            i += 2;
        } else {
            text += raw[i];
        }
    }
    return text;
}

struct WireCase {
    const char* mLabel;
    std::function<void()> mCall;
    const char* mMethod;
    const char* mPath;
    std::vector<std::string> mKeys;
    std::map<std::string, std::string> mValues;  // unquoted
};

const std::string kToken = "tok/+=1";  // needs quoting in a query

TEST(IdentityWire, EachCallSendsItsRequestAsSpecified)
{
    CallRecorder<HttpRequest> arrived;
    LoopbackHttpServer server([arrived](const HttpRequest& request) {
        arrived.Add(request);
        HttpAnswer answer;
        answer.mBody = "{}";
        return answer;
    });
    IdentityURLScope url(server.Url("/ovra"));
    const std::string clientID = kTOLMO_OVRA_CLIENT_ID.ToStdString();
    const std::string secret = kTOLMO_OVRA_CLIENT_SECRET_GM.ToStdString();
    const std::string redirect = kOVRA_GM_SERVER_REDIRECT.ToStdString();

    const std::vector<WireCase> cases = {
        {"sign-in",
         [] { SignIn("ann", "p&ss w=rd"); },
         "POST",
         "/ovra/login/v1/device",
         {"username", "password", "client_id", "client_secret", "device_id", "device_name", "scope", "redirect_uri",
          "locale"},
         {{"username", "ann"},
          {"password", "p&ss w=rd"},
          {"client_id", clientID},
          {"client_secret", secret},
          {"device_id", "device-1"},
          {"device_name", "Desktop"},
          {"scope", "openid,pellucid"},
          {"redirect_uri", redirect},
          {"locale", "en_US"}}},
        {"refresh",
         [] { Refresh(kToken); },
         "POST",
         "/ovra/token/v1",
         {"client_id", "client_secret", "grant_type", "scope", "redirect_uri", "refresh_token"},
         {{"client_id", clientID},
          {"client_secret", secret},
          {"grant_type", "refresh_token"},
          {"scope", "openid,pellucid"},
          {"redirect_uri", redirect},
          {"refresh_token", kToken}}},
        {"sign-out",
         [] { SignOut(kToken); },
         "POST",
         "/ovra/invalidate_token/v1",
         {"token_type", "token", "cascading"},
         {{"token_type", "device_token"}, {"token", kToken}, {"cascading", "all"}}},
    };
    for (const WireCase& wire : cases) {
        SCOPED_TRACE(wire.mLabel);
        const size_t before = arrived.Count();
        wire.mCall();
        ASSERT_EQ(arrived.Count(), before + 1);
        const HttpRequest request = arrived.Last();
        EXPECT_EQ(request.mMethod, wire.mMethod);
        const size_t mark = request.mTarget.find('?');
        ASSERT_NE(mark, std::string::npos) << request.mTarget;
        EXPECT_EQ(request.mTarget.substr(0, mark), wire.mPath);
        const Query query = Split(request.mTarget.substr(mark + 1));
        EXPECT_EQ(query.mKeys, wire.mKeys);
        for (const auto& value : wire.mValues) {
            const std::string raw = query.mRaw.count(value.first) ? query.mRaw.at(value.first) : "?";
            EXPECT_EQ(Unquote(raw), value.second) << value.first;
            // Every character outside the unreserved ones goes out quoted.
            EXPECT_EQ(raw.find_first_of("/+=&,: "), std::string::npos) << value.first << "=" << raw;
        }
        EXPECT_EQ(request.Header("Content-Type"), "application/x-www-form-urlencoded");
        EXPECT_TRUE(request.mBody.empty());
    }

    // The profile's token goes out as it stands, and nothing is declared of a body.
    Profile(kToken);
    ASSERT_EQ(arrived.Count(), cases.size() + 1);
    const HttpRequest profile = arrived.Last();
    EXPECT_EQ(profile.mMethod, "GET");
    EXPECT_EQ(profile.mTarget, "/ovra/profile/v1?bearer_token=" + kToken);
    EXPECT_FALSE(profile.HasHeader("Content-Type"));
    EXPECT_TRUE(profile.mBody.empty());
}

}  // namespace
