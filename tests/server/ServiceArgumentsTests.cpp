// The values `tolmonetsync serve` takes on its command line.

#include <gtest/gtest.h>

#include <functional>

#include "server/ServiceArguments.h"

namespace servertest {
namespace {

using namespace tolmonetsync::server;

TEST(ServiceArguments, PasswordsMayHoldColonsAndTheEmailIsTheLastPart)
{
    const ServiceUser mailed = ParseUserArgument("ann:pa:ss:ann@example.org");
    EXPECT_EQ("ann", mailed.mName);
    EXPECT_EQ("pa:ss", mailed.mPassword);
    EXPECT_EQ("ann@example.org", mailed.mEmail);
    EXPECT_EQ("", ParseUserArgument("ann:pa:ss").mEmail);
    EXPECT_EQ("pa:ss", ParseUserArgument("ann:pa:ss").mPassword);
}

TEST(ServiceArguments, BadValuesAreRefused)
{
    LocalServiceOptions options;
    const std::vector<std::pair<std::string, std::function<void()> > > refused = {
        {"user without a password", [] { ParseUserArgument("ann"); }},
        {"user without a name", [] { ParseUserArgument(":pw"); }},
        {"user with an empty password", [] { ParseUserArgument("ann:"); }},
        {"token not URL-safe", [] { ParseTokenArgument("ann:has space"); }},
        {"empty token", [] { ParseTokenArgument("ann:"); }},
        {"token without a user", [] { ParseTokenArgument("anntoken"); }},
        {"listen beyond loopback", [&] { ParseListenArgument("0.0.0.0:80", options); }},
        {"port by name", [&] { ParseListenArgument("127.0.0.1:http", options); }},
        {"port out of range", [&] { ParseListenArgument("127.0.0.1:70000", options); }},
        {"port without a host", [&] { ParseListenArgument("8080", options); }},
    };
    for (const auto& row : refused) EXPECT_THROW(row.second(), std::invalid_argument) << row.first;
    for (const char* bad : {"", "0", "-5", "1e9", "1 MiB", "99999999999999999999999"})
        EXPECT_THROW(ParseBytesArgument(bad), std::invalid_argument) << bad;
    EXPECT_EQ(1073741824u, ParseBytesArgument("1073741824"));
    ParseListenArgument("localhost:0", options);
    EXPECT_EQ("127.0.0.1", options.mHost);
}

}  // namespace
}  // namespace servertest
