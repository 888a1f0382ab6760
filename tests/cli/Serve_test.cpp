// `tolmonetsync serve` as a person runs it: the first line says where it
// listens, it answers there, secrets come from private files, and a stop
// signal ends it cleanly.

#include <gtest/gtest.h>

#include <httplib.h>

#include "support/CliProcess.h"
#include "support/TempDir.h"

namespace {

using clitest::Contains;

namespace fs = std::filesystem;

// The status of a GET (or of a POST with no body, as the identity calls send),
// signed in with `token` if given; -1 if no answer came.
int Status(const std::string& base, const std::string& path, const std::string& token = std::string(),
           bool post = false)
{
    httplib::Client client(base);
    httplib::Headers headers;
    if (!token.empty()) headers.emplace("Authorization", "Bearer " + token);
    const httplib::Result result =
        post ? client.Post(path.c_str(), headers, "", "text/plain") : client.Get(path, headers);
    return result ? result->status : -1;
}

// A file of secrets with that mode.
std::string SecretFile(const testsupport::TempDir& dir, const std::string& name, const std::string& text,
                       fs::perms mode)
{
    testsupport::WriteFileBytes(dir / name, text);
    fs::permissions(dir / name, mode);
    return (dir / name).string();
}

}  // namespace

TEST(ServeCommand, SaysWhereItListensKeepsItsDataDirectoryStopsOnSignalAndReadsSecretsOnlyFromPrivateFiles)
{
    testsupport::TempDir data;
    testsupport::TempDir files;
    // Its first line on stdout is "listening on ..." even when a warning comes first on stderr.
    clitest::ServedService served(data.Path(), "t0k3n", {}, (files / "err").string());
    EXPECT_EQ(served.Base().rfind("http://127.0.0.1:", 0), 0u) << served.Base();
    EXPECT_EQ(Status(served.Base(), "/api/collections?name=x"), 401);  // no bearer token
    EXPECT_EQ(Status(served.Base(), "/api/collections?name=x", "t0k3n"), 200);
    const std::string warning = testsupport::ReadFileBytes(files / "err");
    EXPECT_TRUE(Contains(warning, "warning: other local users can read command-line arguments")) << warning;

    const clitest::Finished second = clitest::RunCli({"serve", "--data", data.Path().string()});
    EXPECT_EQ(second.mStatus, 1);
    EXPECT_EQ(second.mErr, "data directory " + data.Path().string() + " is in use by another tolmonetsync serve\n");
    EXPECT_EQ(served.Stop(), 0);

    const std::string users = "# who may sign in\n\ncat:pw:9:cat@example.test\n";
    const std::string tokens = "cat:file-token_1\n";
    const fs::perms owner = fs::perms::owner_read | fs::perms::owner_write;
    const fs::perms shared = owner | fs::perms::group_read | fs::perms::others_read;
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

    clitest::ServedService fromFiles(data.Path(), "t0k3n",
                                     {"--users-file", SecretFile(files, "users", users, owner), "--tokens-file",
                                      SecretFile(files, "tokens", tokens, owner)});
    EXPECT_EQ(Status(fromFiles.Base(), "/ovra/login/v1/device?username=cat&password=pw%3A9", "", true), 200);
    EXPECT_EQ(Status(fromFiles.Base(), "/ovra/login/v1/device?username=cat&password=pw", "", true), 401);
    EXPECT_EQ(Status(fromFiles.Base(), "/api/collections?name=x", "file-token_1"), 200);
}
