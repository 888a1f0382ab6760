// What a trace line may show of a URL, a header or an identity answer: the
// shape, the keys and their order, never a secret value.

#include <gtest/gtest.h>

#include <string>

#include "foundation/core/Redaction.h"

using tolmocore::debug::RedactSecrets;

namespace {

struct Case {
    const char* mWhat;
    std::string mText;
    std::string mTraced;
};

TEST(Redaction, BlanksSecretValuesAndKeepsEverythingElse)
{
    const Case cases[] = {
        {"the sign-in URL, a percent-encoded password among plain fields",
         "https://id.example/ovra/login/v1/device?username=ann&password=p%40ss%26w%3Dx&client_id=ABC"
         "&client_secret=0f-1e&device_id=d1&scope=openid%2cpellucid",
         "https://id.example/ovra/login/v1/device?username=ann&password=***&client_id=ABC"
         "&client_secret=***&device_id=d1&scope=openid%2cpellucid"},
        {"the refresh, logout and profile URLs",
         "/token/v1?grant_type=refresh_token&refresh_token=R1#frag /invalidate_token/v1?token_type=device_token"
         "&token=D1&cascading=all",
         "/token/v1?grant_type=refresh_token&refresh_token=***#frag /invalidate_token/v1?token_type=device_token"
         "&token=***&cascading=all"},
        {"keys in any case, and a percent-encoded key", "/p?PassWord=a&ACCESS_TOKEN=b&pass%77ord=c&Bearer_Token=d e",
         "/p?PassWord=***&ACCESS_TOKEN=***&pass%77ord=***&Bearer_Token=***"},
        {"look-alike keys stay", "/p?tokens=1&my_token=2&token_type=3&tokenx=4&password",
         "/p?tokens=1&my_token=2&token_type=3&tokenx=4&password"},
        {"header lines", "Authorization: Bearer abc.def\nauthorization:Basic eA==\r\nContent-Type: text/plain\nToken:",
         "Authorization: ***\nauthorization:***\r\nContent-Type: text/plain\nToken:"},
        {"an identity answer",
         R"({"access_token":"A1","countryCode":"DE","device_token":"D1","email":"a@b","refresh_token":"R1",)"
         R"("token_type":"bearer","userId":"u1"})",
         R"({"access_token":"***","countryCode":"DE","device_token":"***","email":"a@b","refresh_token":"***",)"
         R"("token_type":"bearer","userId":"u1"})"},
        {"JSON at depth, escapes, other value types and a URL in a string",
         R"({"a": {"b": [{"Refresh_Token" : "r\"1\\"}, {"pass\u0077ord": 1234}]}, "token": {"x": ["y"]},)"
         R"( "jump": "https://j/?TOKEN=t1&n=2", "n": null})",
         R"({"a": {"b": [{"Refresh_Token" : "***"}, {"pass\u0077ord": "***"}]}, "token": "***",)"
         R"( "jump": "https://j/?TOKEN=***&n=2", "n": null})"},
        {"broken JSON: a cut-off value", R"({"token": "cut off)", R"({"token": "***)"},
        {"broken JSON: a key behind an unclosed string", R"({"x":"{"password":"p"})", R"({"x":"{"password":"***"})"},
        {"text with nothing secret", "GetRoot, name: a&b=c \"token\" token=", "GetRoot, name: a&b=c \"token\" token="},
    };
    for (const Case& c : cases) EXPECT_EQ(RedactSecrets(c.mText), c.mTraced) << c.mWhat;
    using namespace std::string_literals;
    EXPECT_EQ(RedactSecrets("/?password=x\0y&n=\0"s), "/?password=***&n=\0"s);
}

}  // namespace
