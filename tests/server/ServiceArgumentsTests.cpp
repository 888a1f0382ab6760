// The command-line values of the service.

#include <gtest/gtest.h>

#include "server/ServiceArguments.h"

namespace servertest {
namespace {

using namespace tolmonetsync::server;

TEST(ServiceArguments, UserWithAndWithoutEmail)
{
    const ServiceUser plain = ParseUserArgument("ann:pw");
    EXPECT_EQ("ann", plain.mName);
    EXPECT_EQ("pw", plain.mPassword);
    EXPECT_EQ("", plain.mEmail);
    const ServiceUser mailed = ParseUserArgument("ann:pa:ss:ann@example.org");
    EXPECT_EQ("pa:ss", mailed.mPassword);
    EXPECT_EQ("ann@example.org", mailed.mEmail);
    EXPECT_EQ("pa:ss", ParseUserArgument("ann:pa:ss").mPassword);
}

TEST(ServiceArguments, BadUsersAreRefused)
{
    EXPECT_THROW(ParseUserArgument("ann"), std::invalid_argument);
    EXPECT_THROW(ParseUserArgument(":pw"), std::invalid_argument);
    EXPECT_THROW(ParseUserArgument("ann:"), std::invalid_argument);
}

TEST(ServiceArguments, TokensMustBeUrlSafe)
{
    const ServiceToken token = ParseTokenArgument("ann:abc-DEF_123");
    EXPECT_EQ("ann", token.mUser);
    EXPECT_EQ("abc-DEF_123", token.mToken);
    EXPECT_THROW(ParseTokenArgument("ann:has space"), std::invalid_argument);
    EXPECT_THROW(ParseTokenArgument("ann:"), std::invalid_argument);
    EXPECT_THROW(ParseTokenArgument("anntoken"), std::invalid_argument);
}

TEST(ServiceArguments, ListenOnLoopbackOnly)
{
    LocalServiceOptions options;
    ParseListenArgument("127.0.0.1:8080", options);
    EXPECT_EQ(8080, options.mPort);
    ParseListenArgument("localhost:0", options);
    EXPECT_EQ(0, options.mPort);
    EXPECT_EQ("127.0.0.1", options.mHost);
    EXPECT_THROW(ParseListenArgument("0.0.0.0:80", options), std::invalid_argument);
    EXPECT_THROW(ParseListenArgument("127.0.0.1:http", options), std::invalid_argument);
    EXPECT_THROW(ParseListenArgument("127.0.0.1:70000", options), std::invalid_argument);
    EXPECT_THROW(ParseListenArgument("8080", options), std::invalid_argument);
}

TEST(ServiceArguments, UploadLimitIsAWholePositiveNumberOfBytes)
{
    EXPECT_EQ(1073741824u, ParseBytesArgument("1073741824"));
    for (const char* bad : {"", "0", "-5", "1e9", "1 MiB", "99999999999999999999999"})
        EXPECT_THROW(ParseBytesArgument(bad), std::invalid_argument) << bad;
}

}  // namespace
}  // namespace servertest
