// Reading the token event's JSON.

#include <gtest/gtest.h>

#include <boost/any.hpp>

#include "identity/dialogs/MerrowExtensionLauncher.h"

namespace {

using tolmonetsync::MerrowExtensionLauncher;
using tolmonetsync::OvraTokenResponse;

OvraTokenResponse Read(const char* text)
{
    OvraTokenResponse response;
    response.token = "left over";
    MerrowExtensionLauncher::OvraDeserializeResponse(UTF8String(text), response);
    return response;
}

TEST(TokenResponse, ReadsTheThreeKeysAndNoOther)
{
    const OvraTokenResponse response = Read(R"({"token":"t","userID":"u","email":"e@x","extra":1})");
    EXPECT_EQ(response.token, "t");
    EXPECT_EQ(response.userID, "u");
    EXPECT_EQ(response.email, "e@x");
}

TEST(TokenResponse, MissingKeysAndNullGiveEmptyFields)
{
    const OvraTokenResponse some = Read(R"({"token":"t"})");
    EXPECT_EQ(some.token, "t");
    EXPECT_TRUE(some.userID.empty());
    EXPECT_TRUE(some.email.empty());
    EXPECT_TRUE(Read("null").token.empty());
}

TEST(TokenResponse, AnythingElseThrows)
{
    EXPECT_THROW(Read("[1]"), boost::bad_any_cast);
    EXPECT_THROW(Read(R"("text")"), boost::bad_any_cast);
    EXPECT_THROW(Read(R"({"email":true})"), boost::bad_any_cast);
    EXPECT_THROW(Read("{\"token\":"), std::exception);
}

}  // namespace
