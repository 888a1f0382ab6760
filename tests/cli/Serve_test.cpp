// `tolmonetsync serve` as a person runs it: the first line says where it
// listens, it answers there, and a stop signal ends it cleanly.

#include <gtest/gtest.h>

#include <curl/curl.h>

#include "CliProcess.h"
#include "support/TempDir.h"

namespace {

// The status of METHOD url, with one extra header if given; 0 if no answer came.
long Status(const std::string& method, const std::string& url, const std::string& header = std::string())
{
    CURL* curl = curl_easy_init();
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl, CURLOPT_CUSTOMREQUEST, method.c_str());
    if (method == "POST") curl_easy_setopt(curl, CURLOPT_POSTFIELDS, "");  // the identity calls send no body
    curl_slist* headers = header.empty() ? nullptr : curl_slist_append(nullptr, header.c_str());
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(
        curl, CURLOPT_WRITEFUNCTION, +[](char*, size_t size, size_t count, void*) { return size * count; });
    long status = 0;
    if (curl_easy_perform(curl) == CURLE_OK) curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
    curl_easy_cleanup(curl);
    curl_slist_free_all(headers);
    return status;
}

// A file of secrets with that mode.
std::string SecretFile(const testsupport::TempDir& dir, const std::string& name, const std::string& text,
                       std::filesystem::perms mode)
{
    const std::filesystem::path path = dir / name;
    testsupport::WriteFileBytes(path, text);
    std::filesystem::permissions(path, mode);
    return path.string();
}

bool Contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

}  // namespace

TEST(ServeCommand, SaysWhereItListensAnswersThereAndStopsOnSignal)
{
    testsupport::TempDir data;
    testsupport::TempDir outputs;
    // Its first line on stdout is "listening on ..." even when a warning comes first on stderr.
    clitest::ServedService served(data.Path(), "t0k3n", {}, (outputs / "err").string());
    EXPECT_EQ(served.Base().rfind("http://127.0.0.1:", 0), 0u) << served.Base();
    EXPECT_EQ(Status("GET", served.ApiUrl() + "/collections?name=x"), 401);  // no bearer token
    const std::string warning = testsupport::ReadFileBytes(outputs / "err");
    EXPECT_TRUE(Contains(warning, "warning: other local users can read command-line arguments")) << warning;
    EXPECT_EQ(served.Stop(), 0);
}

TEST(ServeCommand, ASecondServeOnABusyDataDirectoryExitsOne)
{
    testsupport::TempDir data;
    clitest::ServedService first(data.Path(), "t0k3n");
    const clitest::Finished second = clitest::RunCli({"serve", "--data", data.Path().string()});
    EXPECT_EQ(second.mStatus, 1);
    EXPECT_EQ(second.mErr, "data directory " + data.Path().string() + " is in use by another tolmonetsync serve\n");
    EXPECT_EQ(Status("GET", first.ApiUrl() + "/collections?name=x", "Authorization: Bearer t0k3n"), 200);
}

TEST(ServeCommand, SecretsComeFromFilesTheirOwnerAloneMayRead)
{
    using std::filesystem::perms;
    testsupport::TempDir data;
    testsupport::TempDir files;
    const std::string users = "# who may sign in\n\ncat:pw:9:cat@example.test\n";
    const std::string tokens = "cat:file-token_1\n";
    const perms shared = perms::owner_read | perms::owner_write | perms::group_read | perms::others_read;
    const perms owner = perms::owner_read | perms::owner_write;
    for (const char* option : {"--users-file", "--tokens-file"}) {
        const std::string open = SecretFile(files, "open", tokens, shared);
        const clitest::Finished refused = clitest::RunCli({"serve", "--data", data.Path().string(), option, open});
        EXPECT_EQ(refused.mStatus, 2) << option;
        EXPECT_TRUE(Contains(refused.mErr, open + ": other users may read it (mode 0644)")) << refused.mErr;
        const clitest::Finished notFile =
            clitest::RunCli({"serve", "--data", data.Path().string(), option, files.Path().string()});
        EXPECT_EQ(notFile.mStatus, 2) << option;
        EXPECT_TRUE(Contains(notFile.mErr, "not a regular file")) << notFile.mErr;
    }
    const std::string malformed = SecretFile(files, "bad", "cat:pw\nhunter2-without-a-name\n", owner);
    const clitest::Finished bad = clitest::RunCli({"serve", "--data", data.Path().string(), "--users-file", malformed});
    EXPECT_EQ(bad.mStatus, 2);
    EXPECT_TRUE(Contains(bad.mErr, malformed + ": line 2: expected NAME:PASSWORD[:EMAIL]")) << bad.mErr;
    EXPECT_FALSE(Contains(bad.mErr, "hunter2")) << bad.mErr;

    clitest::ServedService served(data.Path(), "t0k3n",
                                  {"--users-file", SecretFile(files, "users", users, owner), "--tokens-file",
                                   SecretFile(files, "tokens", tokens, owner)});
    EXPECT_EQ(Status("POST", served.Base() + "/ovra/login/v1/device?username=cat&password=pw%3A9"), 200);
    EXPECT_EQ(Status("POST", served.Base() + "/ovra/login/v1/device?username=cat&password=pw"), 401);
    EXPECT_EQ(Status("GET", served.ApiUrl() + "/collections?name=x", "Authorization: Bearer file-token_1"), 200);
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
