// Bodies the service must not hold: `tolmonetsync serve` as a process of its
// own, sent bodies made on the fly, and its peak memory (VmHWM) read before
// and after. A refused body is answered without being read, a request head
// is bounded, and an accepted upload goes to its file as it arrives.

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <string>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <curl/curl.h>
#include <gtest/gtest.h>
#include <boost/json.hpp>

#include "support/CliProcess.h"
#include "ServiceClient.h"
#include "support/TempDir.h"

namespace servertest {
namespace {

const char kToken[] = "body-limit-token";
const std::uint64_t kMiB = std::uint64_t(1) << 20;
const std::uint64_t kMaxUpload = 256 * kMiB;
// How far the service's peak may rise while a body passes: far below any body sent.
const long kPeakSlackKiB = 64 * 1024;

struct Sent {
    CURLcode mCode = CURLE_OK;
    long mStatus = 0;
    std::string mBody;
};

// POSTs `size` bytes made as they are sent, with no "Expect: 100-continue",
// so the body follows the headers unasked.
Sent PostGenerated(const std::string& url, const std::string& token, std::uint64_t size)
{
    struct Source {
        std::uint64_t mLeft;
    } source{size};
    Sent sent;
    CURL* curl = curl_easy_init();
    curl_slist* headers = curl_slist_append(nullptr, "Expect:");
    headers = curl_slist_append(headers, "Content-Type: application/octet-stream");
    if (!token.empty()) headers = curl_slist_append(headers, ("Authorization: Bearer " + token).c_str());
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(curl, CURLOPT_POST, 1L);
    curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(size));
    curl_easy_setopt(curl, CURLOPT_READDATA, &source);
    curl_easy_setopt(
        curl, CURLOPT_READFUNCTION, +[](char* buffer, size_t item, size_t count, void* user) -> size_t {
            auto* from = static_cast<Source*>(user);
            const std::size_t n = static_cast<std::size_t>(std::min<std::uint64_t>(item * count, from->mLeft));
            std::memset(buffer, 'x', n);
            from->mLeft -= n;
            return n;
        });
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &sent.mBody);
    curl_easy_setopt(
        curl, CURLOPT_WRITEFUNCTION, +[](char* data, size_t item, size_t count, void* user) -> size_t {
            static_cast<std::string*>(user)->append(data, item * count);
            return item * count;
        });
    sent.mCode = curl_easy_perform(curl);
    curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &sent.mStatus);
    curl_slist_free_all(headers);
    curl_easy_cleanup(curl);
    return sent;
}

// Sends a request line that never ends, `size` bytes of it; gives how many
// the service took before it closed the connection.
std::uint64_t SendEndlessRequestLine(const std::string& apiUrl, std::uint64_t size)
{
    const std::size_t colon = apiUrl.rfind(':');
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<std::uint16_t>(std::stoi(apiUrl.substr(colon + 1))));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    const int fd = ::socket(AF_INET, SOCK_STREAM, 0);
    EXPECT_EQ(0, ::connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address));
    std::string chunk = "GET /api/";
    chunk.resize(64 * 1024, 'a');
    std::uint64_t sent = 0;
    while (sent < size) {
        const ssize_t n = ::send(fd, chunk.data(), chunk.size(), MSG_NOSIGNAL);
        if (n <= 0) break;
        sent += static_cast<std::uint64_t>(n);
    }
    ::close(fd);
    return sent;
}

long PeakKiB(pid_t pid)
{
    std::ifstream status("/proc/" + std::to_string(pid) + "/status");
    for (std::string line; std::getline(status, line);) {
        if (line.rfind("VmHWM:", 0) == 0) return std::stol(line.substr(6));
    }
    ADD_FAILURE() << "no VmHWM for process " << pid;
    return 0;
}

class ServedBodyTest : public ::testing::Test {
protected:
    ServedBodyTest() : mServed(mData.Path(), kToken, {"--max-upload", std::to_string(kMaxUpload)}) {}

    std::string UploadUrl()
    {
        ServiceClient client(mServed.ApiUrl(), kToken);
        const Reply root = client.Send("GET", "/collections?name=app");
        EXPECT_EQ(200, root.mStatus) << root.mBody;
        const std::string id = boost::json::value_to<std::string>(boost::json::parse(root.mBody).at(0).at("id"));
        return mServed.ApiUrl() + "/assets?name=big.bin&collections=" + Quote("[\"/api/collections/" + id + "\"]");
    }

    // Files under the content directory whose names start with prefix.
    std::size_t ContentFiles(const std::string& prefix) const
    {
        std::size_t count = 0;
        for (const auto& entry : std::filesystem::directory_iterator(mData.Path() / "content"))
            if (entry.path().filename().string().rfind(prefix, 0) == 0) ++count;
        return count;
    }

    testsupport::TempDir mData;
    clitest::ServedService mServed;
};

TEST_F(ServedBodyTest, RefusedBodiesAreAnsweredWithoutBeingHeld)
{
    const std::string upload = UploadUrl();

    long before = PeakKiB(mServed.Pid());
    const Sent stranger = PostGenerated(upload, "", 1024 * kMiB);
    EXPECT_EQ(401, stranger.mStatus) << curl_easy_strerror(stranger.mCode);
    EXPECT_EQ("missing or unknown access token", stranger.mBody);
    EXPECT_LT(PeakKiB(mServed.Pid()) - before, kPeakSlackKiB);

    before = PeakKiB(mServed.Pid());
    const Sent tooLarge = PostGenerated(upload, kToken, kMaxUpload + kMiB);
    EXPECT_EQ(413, tooLarge.mStatus) << curl_easy_strerror(tooLarge.mCode);
    EXPECT_LT(PeakKiB(mServed.Pid()) - before, kPeakSlackKiB);
    EXPECT_EQ(0u, ContentFiles("incoming."));

    // A head that never ends is cut off long before it could fill memory.
    before = PeakKiB(mServed.Pid());
    EXPECT_LT(SendEndlessRequestLine(mServed.ApiUrl(), 256 * kMiB), 256 * kMiB);
    EXPECT_LT(PeakKiB(mServed.Pid()) - before, kPeakSlackKiB);

    // Still serving, and nothing was kept of any of them.
    ServiceClient client(mServed.ApiUrl(), kToken);
    const Reply found = client.Send("POST", "/search?q=" + Quote("{\"name\": \"big.bin\"}"));
    EXPECT_EQ(200, found.mStatus);
    EXPECT_EQ("[]", found.mBody);
}

TEST_F(ServedBodyTest, AnUploadGoesToItsFileAsItArrives)
{
    const std::string upload = UploadUrl();
    const long before = PeakKiB(mServed.Pid());
    const Sent sent = PostGenerated(upload, kToken, kMaxUpload);
    ASSERT_EQ(201, sent.mStatus) << curl_easy_strerror(sent.mCode) << " " << sent.mBody;
    EXPECT_LT(PeakKiB(mServed.Pid()) - before, kPeakSlackKiB);
    const std::string id = boost::json::value_to<std::string>(boost::json::parse(sent.mBody).at("id"));
    EXPECT_EQ(kMaxUpload, std::filesystem::file_size(mData.Path() / "content" / id));
}

}  // namespace
}  // namespace servertest
