// What the service acknowledged is there after a restart or an abrupt exit,
// and what it did not finish leaves nothing behind.

#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>

#include "ServiceFixture.h"
#include "server/ContentFiles.h"

namespace servertest {
namespace {

class DurabilityTest : public ServiceTest {
protected:
    std::size_t ContentFileCount()
    {
        const std::filesystem::directory_iterator files(mService.DataDirectory() / "content");
        return static_cast<std::size_t>(std::distance(begin(files), end(files)));
    }
};

TEST_F(DurabilityTest, WhatWasAcknowledgedSurvivesARestartAndNothingHalfMadeOrDeletedKeepsItsBytes)
{
    const std::string root = ClientRoot(*mAlice, "app");
    const std::string folder = CreateCollection(*mAlice, "folder", kPreferencesType);
    AddMember(*mAlice, root, "/collections/" + folder);
    const std::string second = Upload(*mAlice, folder, "second", "2");
    const std::string first = Upload(*mAlice, folder, "first", std::string("\0\1", 2), "");
    const std::string etag = mAlice->Send("GET", "/assets/" + first).Header("ETag");
    const std::string gone = Upload(*mAlice, folder, "gone", "g");
    ASSERT_EQ(200, mAlice->Send("DELETE", "/assets/" + gone + "?recursive=true").mStatus);
    EXPECT_EQ(2u, ContentFileCount());
    // An upload whose connection closes after a part of the body it announced.
    const int fd = ConnectLoopback(mService->Port());
    ASSERT_GE(fd, 0);
    const std::string request =
        "POST /api/assets?name=cut" + Into(folder) + " HTTP/1.1\r\nHost: 127.0.0.1\r\nAuthorization: Bearer " +
        kAliceToken + "\r\nContent-Type: text/plain\r\nContent-Length: 100000\r\n\r\n" + std::string(1000, 'x');
    ASSERT_EQ(static_cast<ssize_t>(request.size()), ::send(fd, request.data(), request.size(), MSG_NOSIGNAL));
    ::close(fd);
    // What a crash after the bytes were synced and before the metadata committed leaves.
    testsupport::WriteFileBytes(mService.DataDirectory() / "content" / "0123456789abcdef0123456789abcdef", "orphan");
    testsupport::WriteFileBytes(mService.DataDirectory() / "content" / "incoming.x.ABCDEF", "half");

    // Stopping waits for every connection's thread, so the cut upload has been dealt with.
    Restart();

    EXPECT_EQ(root, ClientRoot(*mAlice, "app"));
    EXPECT_EQ((std::vector<std::string>{folder}), Ids(mAlice->Send("GET", "/collections/" + root + "/members")));
    EXPECT_EQ((std::vector<std::string>{second, first}),
              Ids(mAlice->Send("GET", "/collections/" + folder + "/members")));
    EXPECT_TRUE(Ids(Search(*mAlice, "{\"name\":\"cut\"}")).empty());
    EXPECT_EQ(2u, ContentFileCount());
    EXPECT_EQ(0u, mService->Content().TemporaryCount());
    const Reply download = mAlice->Send("GET", "/assets/" + first);
    EXPECT_EQ(std::string("\0\1", 2), download.mBody);
    EXPECT_EQ("application/octet-stream", download.Header("Content-Type"));  // none was given
    EXPECT_FALSE(download.Header("Last-Modified").empty());
    EXPECT_EQ(etag, download.Header("ETag"));
    EXPECT_EQ(304, mAlice->Send("GET", "/assets/" + first, "", {"If-None-Match: " + etag}).mStatus);
    EXPECT_EQ(200, mAlice->Send("GET", "/assets/" + first, "", {"If-None-Match: \"stale\""}).mStatus);
    EXPECT_EQ(404, mBob->Send("GET", "/assets/" + first).mStatus);
    // Content goes out from its file in pieces: one of several pieces, and none.
    std::string large(600 * 1024, '\0');
    for (std::size_t i = 0; i < large.size(); ++i) large[i] = static_cast<char>(i * 7 % 251);
    EXPECT_EQ(large, mAlice->Send("GET", "/assets/" + Upload(*mAlice, folder, "large", large)).mBody);
    const Reply empty = mAlice->Send("GET", "/assets/" + Upload(*mAlice, folder, "empty", ""));
    EXPECT_EQ(200, empty.mStatus);
    EXPECT_EQ("", empty.mBody);
}

TEST(AbruptExit, AnAcknowledgedUploadSurvivesIt)
{
    // Forks before any thread exists: a child forked from a process with
    // running threads may inherit a lock that no thread will ever release.
    // The child serves and leaves with _exit right after the 201: no
    // destructor, no checkpoint, no close.
    testsupport::TempDir root;
    int pipeFds[2];
    ASSERT_EQ(0, ::pipe(pipeFds));
    const pid_t child = ::fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        ::close(pipeFds[0]);
        auto* service = new tolmonetsync::server::LocalService(testsupport::TestService::DefaultOptions(root.Path()));
        service->Start();
        auto* client = new ServiceClient(service->AssetServiceUrl(), kAliceToken);
        const std::string body = "{\"header\":{\"name\":\"f\",\"type\":\"" + std::string(kCollectionType) + "\"}}";
        const std::string folder = IdFromLocation(client->Send("POST", "/collections", body, kJson).Header("Location"));
        const Reply upload = client->Send("POST", "/assets?name=kept" + Into(folder), "survivor");
        const std::string line = upload.mStatus == 201 ? IdFromLocation(upload.Header("Location")) : "failed";
        if (::write(pipeFds[1], line.data(), line.size()) < 0) ::_exit(2);
        ::_exit(0);
    }
    ::close(pipeFds[1]);
    std::string id;
    char buffer[256];
    for (ssize_t n; (n = ::read(pipeFds[0], buffer, sizeof(buffer))) > 0;) id.append(buffer, n);
    ::close(pipeFds[0]);
    int status = 0;
    ASSERT_EQ(child, ::waitpid(child, &status, 0));
    ASSERT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
    ASSERT_NE("failed", id);
    ASSERT_FALSE(id.empty());

    const std::string directory = testsupport::TestService::DefaultOptions(root.Path()).mDataDirectory;
    testsupport::TestService reopened([&](auto& options) { options.mDataDirectory = directory; });
    EXPECT_EQ("survivor", ServiceClient(reopened->AssetServiceUrl(), kAliceToken).Send("GET", "/assets/" + id).mBody);
}

}  // namespace
}  // namespace servertest
