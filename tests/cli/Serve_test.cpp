// `tolmonetsync serve` as a person runs it: the first line says where it
// listens, it answers there, and a stop signal ends it cleanly.

#include <gtest/gtest.h>

#include <curl/curl.h>

#include "CliProcess.h"
#include "support/TempDir.h"

namespace {

long GetStatus(const std::string& url)
{
    CURL* curl = curl_easy_init();
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(
        curl, CURLOPT_WRITEFUNCTION, +[](char*, size_t size, size_t count, void*) { return size * count; });
    long status = 0;
    if (curl_easy_perform(curl) == CURLE_OK) curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
    curl_easy_cleanup(curl);
    return status;
}

}  // namespace

TEST(ServeCommand, SaysWhereItListensAnswersThereAndStopsOnSignal)
{
    testsupport::TempDir data;
    clitest::ServedService served(data.Path(), "t0k3n");
    EXPECT_EQ(served.Base().rfind("http://127.0.0.1:", 0), 0u) << served.Base();
    EXPECT_EQ(GetStatus(served.ApiUrl() + "/collections?name=x"), 401);  // no bearer token
    EXPECT_EQ(served.Stop(), 0);
}

TEST(ServeCommand, BadUsageExitsTwoWithTheUsageLine)
{
    const clitest::Finished missingData = clitest::RunCli({"serve", "--listen", "127.0.0.1:0"});
    EXPECT_EQ(missingData.mStatus, 2);
    EXPECT_NE(missingData.mErr.find("--data is required"), std::string::npos) << missingData.mErr;
    EXPECT_NE(missingData.mErr.find("usage: tolmonetsync serve"), std::string::npos);

    const clitest::Finished badToken = clitest::RunCli({"serve", "--data", "/tmp", "--token", "no-colon"});
    EXPECT_EQ(badToken.mStatus, 2);

    const clitest::Finished help = clitest::RunCli({"serve", "--help"});
    EXPECT_EQ(help.mStatus, 0);
    EXPECT_NE(help.mOut.find("listening on http://HOST:PORT"), std::string::npos);
}
