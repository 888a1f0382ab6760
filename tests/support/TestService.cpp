#include "support/TestService.h"

#include <limits>

namespace testsupport {

using tolmonetsync::server::LocalService;
using tolmonetsync::server::LocalServiceOptions;

const char kAliceToken[] = "alice-token_0123456789";
const char kBobToken[] = "bob-token_9876543210";

LocalServiceOptions TestService::DefaultOptions(const std::filesystem::path& root)
{
    LocalServiceOptions options;
    options.mDataDirectory = (root / "data").string();
    options.mTokens.push_back({"alice", kAliceToken});
    options.mTokens.push_back({"bob", kBobToken});
    return options;
}

TestService::TestService(const Customise& customise) : mOptions(DefaultOptions(mRoot.Path()))
{
    if (customise) customise(mOptions);
    mDataDirectory = mOptions.mDataDirectory;
    Restart();
}

TestService::~TestService()
{
    Stop();
}

std::shared_ptr<const tolmonetsync::server::FaultHandle> CountRequests(tolmonetsync::server::LocalService& service,
                                                                       const std::string& pathPattern)
{
    tolmonetsync::server::FaultRule rule;
    rule.mPathPattern = pathPattern;
    rule.mNth = std::numeric_limits<int>::max();
    return service.Faults().Install(rule);
}

void TestService::Stop()
{
    mService.reset();
}

void TestService::Restart()
{
    Stop();
    mService = std::make_unique<LocalService>(mOptions);
    mService->Start();
}

}  // namespace testsupport
