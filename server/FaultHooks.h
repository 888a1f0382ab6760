#pragma once
// Faults the service injects on its own side, as a real server would fail:
// a test installs a rule, the Nth request matching its method and path
// meets the fault, and the rule's handle tells whether that happened.
//
// Threads: any thread may install, clear and match at any time.

#include <atomic>
#include <chrono>
#include <memory>
#include <mutex>
#include <regex>
#include <string>
#include <vector>

#include <boost/optional.hpp>

namespace tolmonetsync {
namespace server {

enum FaultAction {
    FaultAction_Status,             // answer mStatus with mBody as text
    FaultAction_Delay,              // wait mDelay, then answer as usual
    FaultAction_CloseBeforeAnswer,  // drop the connection; not a byte of answer
    FaultAction_CloseMidBody,       // send the headers and half the body, then drop
    FaultAction_NotJson,            // 200 with a body that is not JSON
    FaultAction_WrongShapeJson,     // 200 with JSON no asset reader takes
};

struct FaultRule {
    std::string mMethod;       // "GET", "POST", ...; empty matches every method
    std::string mPathPattern;  // ECMAScript regular expression over the whole path
    // ECMAScript regular expression searched for in the raw query text (what
    // follows "?"); empty matches every query, none included.
    std::string mQueryPattern;
    int mNth = 1;  // 1 is the first matching request after install
    FaultAction mAction = FaultAction_Status;
    int mStatus = 500;
    std::string mBody = "injected failure";
    std::chrono::milliseconds mDelay{0};
};

class FaultHandle {
public:
    bool Fired() const { return mFired.load(); }
    int Seen() const { return mSeen.load(); }  // matching requests so far

private:
    friend class FaultHooks;
    std::atomic<bool> mFired{false};
    std::atomic<int> mSeen{0};
};

class FaultHooks {
public:
    // Throws std::regex_error for a bad pattern.
    std::shared_ptr<const FaultHandle> Install(const FaultRule& rule);
    void Clear();
    // The rule that fires for this request, if any; counts the request
    // against every rule it matches. One request meets at most one fault.
    boost::optional<FaultRule> Match(const std::string& method, const std::string& path,
                                     const std::string& query = std::string());

private:
    struct Entry {
        FaultRule mRule;
        std::regex mPattern;
        std::regex mQuery;
        std::shared_ptr<FaultHandle> mHandle;
    };
    std::mutex mMutex;  // guards mEntries
    std::vector<Entry> mEntries;
};

// Shuts down the loopback connection between the service's port and the
// client's port, found among the process's sockets. False if none is found.
bool DropConnection(int servicePort, int clientPort);

}  // namespace server
}  // namespace tolmonetsync
