#include "server/FaultHooks.h"

#include <cstdlib>

#include <arpa/inet.h>
#include <dirent.h>
#include <netinet/in.h>
#include <sys/socket.h>

namespace tolmonetsync {
namespace server {

std::shared_ptr<const FaultHandle> FaultHooks::Install(const FaultRule& rule)
{
    Entry entry{rule, std::regex(rule.mPathPattern), std::regex(rule.mQueryPattern), std::make_shared<FaultHandle>()};
    std::lock_guard<std::mutex> lock(mMutex);
    mEntries.push_back(entry);
    return entry.mHandle;
}

void FaultHooks::Clear()
{
    std::lock_guard<std::mutex> lock(mMutex);
    mEntries.clear();
}

boost::optional<FaultRule> FaultHooks::Match(const std::string& method, const std::string& path,
                                             const std::string& query)
{
    std::lock_guard<std::mutex> lock(mMutex);
    boost::optional<FaultRule> chosen;
    for (Entry& entry : mEntries) {
        if (!entry.mRule.mMethod.empty() && entry.mRule.mMethod != method) continue;
        if (!std::regex_match(path, entry.mPattern)) continue;
        if (!entry.mRule.mQueryPattern.empty() && !std::regex_search(query, entry.mQuery)) continue;
        const int seen = ++entry.mHandle->mSeen;
        if (seen == entry.mRule.mNth && !chosen) {
            entry.mHandle->mFired = true;
            chosen = entry.mRule;
        }
    }
    return chosen;
}

bool DropConnection(int servicePort, int clientPort)
{
    // The HTTP layer does not hand out its sockets, so find ours by its ports.
    DIR* dir = ::opendir("/proc/self/fd");
    if (!dir) return false;
    bool dropped = false;
    while (dirent* entry = ::readdir(dir)) {
        char* end = nullptr;
        const long fd = std::strtol(entry->d_name, &end, 10);
        if (end == entry->d_name || *end != '\0' || fd == ::dirfd(dir)) continue;
        sockaddr_in local{};
        sockaddr_in peer{};
        socklen_t localSize = sizeof(local);
        socklen_t peerSize = sizeof(peer);
        if (::getsockname(static_cast<int>(fd), reinterpret_cast<sockaddr*>(&local), &localSize) != 0) continue;
        if (local.sin_family != AF_INET || ntohs(local.sin_port) != servicePort) continue;
        if (::getpeername(static_cast<int>(fd), reinterpret_cast<sockaddr*>(&peer), &peerSize) != 0) continue;
        if (ntohs(peer.sin_port) != clientPort) continue;
        ::shutdown(static_cast<int>(fd), SHUT_RDWR);
        dropped = true;
        break;
    }
    ::closedir(dir);
    return dropped;
}

}  // namespace server
}  // namespace tolmonetsync
