#pragma once
// The local service on 127.0.0.1:0 over a data directory of its own, removed
// with it: the one way tests start a service in their own process.
//
//   testsupport::TestService service;                      // users from DefaultOptions
//   testsupport::TestService tls([](auto& o) { o.mCertificateFile = ...; });
//
// Threads: start, restart and destruction on the test's thread; the service
// answers on its own threads.

#include <filesystem>
#include <functional>
#include <memory>
#include <string>

#include "server/LocalService.h"
#include "support/TempDir.h"

namespace testsupport {

// Tokens the default options give to the users "alice" and "bob".
extern const char kAliceToken[];
extern const char kBobToken[];

class TestService {
public:
    using Customise = std::function<void(tolmonetsync::server::LocalServiceOptions&)>;

    // Started, with the default options changed by `customise`.
    explicit TestService(const Customise& customise = Customise());
    ~TestService();
    TestService(const TestService&) = delete;
    TestService& operator=(const TestService&) = delete;

    tolmonetsync::server::LocalService& operator*() { return *mService; }
    tolmonetsync::server::LocalService* operator->() { return mService.get(); }
    const tolmonetsync::server::LocalServiceOptions& Options() const { return mOptions; }
    const std::filesystem::path& DataDirectory() const { return mDataDirectory; }

    // Stops the service and starts another over the same data directory.
    void Restart();
    // Stops it; the data directory stays until the object goes.
    void Stop();

    // alice and bob with their tokens, never expiring, on a data directory
    // under `root`; everything else as a served service has it.
    static tolmonetsync::server::LocalServiceOptions DefaultOptions(const std::filesystem::path& root);

private:
    TempDir mRoot;
    std::filesystem::path mDataDirectory;
    tolmonetsync::server::LocalServiceOptions mOptions;
    std::unique_ptr<tolmonetsync::server::LocalService> mService;
};

// Counts the requests whose path matches, by a fault rule that never fires.
std::shared_ptr<const tolmonetsync::server::FaultHandle> CountRequests(tolmonetsync::server::LocalService& service,
                                                                       const std::string& pathPattern = ".*");

}  // namespace testsupport
