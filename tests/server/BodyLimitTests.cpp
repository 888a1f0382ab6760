// Bodies the service must not hold: `tolmonetsync serve` as a process of its
// own, sent bodies made on the fly, and its peak memory (VmHWM) read before
// and after. A refused body is answered without being read, a request head
// is bounded, and an accepted upload goes to its file as it arrives.

#include <sys/socket.h>
#include <unistd.h>

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>

#include <gtest/gtest.h>
#include <boost/json.hpp>

#include "ServiceClient.h"
#include "support/CliProcess.h"
#include "support/TempDir.h"

namespace servertest {
namespace {

const char kToken[] = "body-limit-token";
const std::uint64_t kMiB = std::uint64_t(1) << 20;
const std::uint64_t kMaxUpload = 256 * kMiB;
// How far the service's peak may rise while a body passes: far below any body sent.
const long kPeakSlackKiB = 64 * 1024;

class ServedBodyTest : public ::testing::Test {
protected:
    ServedBodyTest() : mServed(mData.Path(), kToken, {"--max-upload", std::to_string(kMaxUpload)}) {}

    // The upload path into the client root.
    std::string Upload()
    {
        const Reply root = mClient.Send("GET", "/collections?name=app");
        EXPECT_EQ(200, root.mStatus) << root.mBody;
        const std::string id = boost::json::value_to<std::string>(boost::json::parse(root.mBody).at(0).at("id"));
        return "/assets?name=big.bin&collections=" + Quote("[\"/api/collections/" + id + "\"]");
    }

    // How far the service's peak memory rose while `send` ran, in KiB.
    template <class Send>
    long PeakRise(Send send)
    {
        const long before = PeakKiB();
        send();
        return PeakKiB() - before;
    }
    long PeakKiB() const
    {
        std::ifstream status("/proc/" + std::to_string(mServed.Pid()) + "/status");
        for (std::string line; std::getline(status, line);) {
            if (line.rfind("VmHWM:", 0) == 0) return std::stol(line.substr(6));
        }
        ADD_FAILURE() << "no VmHWM for the service";
        return 0;
    }

    testsupport::TempDir mData;
    clitest::ServedService mServed;
    ServiceClient mClient{mServed.ApiUrl(), kToken};
};

TEST_F(ServedBodyTest, RefusedBodiesAreAnsweredWithoutBeingHeld)
{
    const std::string upload = Upload();
    EXPECT_LT(PeakRise([&] {
                  const Reply stranger = ServiceClient(mServed.ApiUrl(), "").PostGenerated(upload, 1024 * kMiB);
                  EXPECT_EQ(401, stranger.mStatus) << curl_easy_strerror(stranger.mCode);
                  EXPECT_EQ("missing or unknown access token", stranger.mBody);
              }),
              kPeakSlackKiB);
    EXPECT_LT(PeakRise([&] {
                  const Reply tooLarge = mClient.PostGenerated(upload, kMaxUpload + kMiB);
                  EXPECT_EQ(413, tooLarge.mStatus) << curl_easy_strerror(tooLarge.mCode);
              }),
              kPeakSlackKiB);
    for (const auto& entry : std::filesystem::directory_iterator(mData.Path() / "content"))
        EXPECT_NE(0u, entry.path().filename().string().rfind("incoming.", 0)) << entry.path();

    // A head that never ends is cut off long before it could fill memory.
    EXPECT_LT(PeakRise([&] {
                  const int fd = ConnectLoopback(std::stoi(mServed.Base().substr(mServed.Base().rfind(':') + 1)));
                  ASSERT_GE(fd, 0);
                  std::string chunk = "GET /api/";
                  chunk.resize(64 * 1024, 'a');
                  std::uint64_t sent = 0;
                  while (sent < 256 * kMiB) {
                      const ssize_t n = ::send(fd, chunk.data(), chunk.size(), MSG_NOSIGNAL);
                      if (n <= 0) break;
                      sent += static_cast<std::uint64_t>(n);
                  }
                  ::close(fd);
                  EXPECT_LT(sent, 256 * kMiB);
              }),
              kPeakSlackKiB);

    // Still serving, and nothing was kept of any of them.
    const Reply found = mClient.Send("POST", "/search?q=" + Quote("{\"name\": \"big.bin\"}"));
    EXPECT_EQ(200, found.mStatus);
    EXPECT_EQ("[]", found.mBody);
}

TEST_F(ServedBodyTest, AnUploadGoesToItsFileAsItArrives)
{
    const std::string upload = Upload();
    Reply sent;
    EXPECT_LT(PeakRise([&] { sent = mClient.PostGenerated(upload, kMaxUpload); }), kPeakSlackKiB);
    ASSERT_EQ(201, sent.mStatus) << curl_easy_strerror(sent.mCode) << " " << sent.mBody;
    const std::string id = boost::json::value_to<std::string>(boost::json::parse(sent.mBody).at("id"));
    EXPECT_EQ(kMaxUpload, std::filesystem::file_size(mData.Path() / "content" / id));
}

}  // namespace
}  // namespace servertest
