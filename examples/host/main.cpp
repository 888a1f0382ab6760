// A host keeping one folder of settings in step with the asset service.
//
//   host_example SERVER_URL TOKEN FOLDER PREF_DIR
//
// SERVER_URL is the asset service's base URL ("http://127.0.0.1:PORT/api" for
// `tolmonetsync serve`), TOKEN an access token of the user, FOLDER the folder
// whose ".json" files are kept in step, PREF_DIR where the library keeps its
// cache file and backups.

#include <tolmonetsync/tolmonetsync.h>

#include <condition_variable>
#include <iostream>
#include <memory>
#include <mutex>
#include <string>

using namespace tolmonetsync;
namespace fs = tolmocore::filesupport;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

namespace {

// The callbacks come on the library's completion thread (or, for a pass with
// nothing to send, inside DoSync); the main thread waits here for the end.
class Outcome {
public:
    void Finish(bool ok, const std::string& text)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mDone) return;  // the first word counts: an error may be followed by success
        mDone = true;
        mOk = ok;
        mText = text;
        mChanged.notify_all();
    }
    bool Wait(std::string& text)
    {
        std::unique_lock<std::mutex> lock(mMutex);
        mChanged.wait(lock, [this] { return mDone; });
        text = mText;
        return mOk;
    }

private:
    std::mutex mMutex;
    std::condition_variable mChanged;
    bool mDone = false;
    bool mOk = false;
    std::string mText;
};

}  // namespace

int main(int argc, char** argv)
{
    if (argc != 5) {
        std::cerr << "usage: host_example SERVER_URL TOKEN FOLDER PREF_DIR\n";
        return 2;
    }
    // 1. Who the host is, and where its preferences live. Set before any service is made.
    tolmocore::config::SetCompanyName(u"Example Company");
    tolmocore::config::SetClientName(u"ExampleHost");
    tolmocore::config::SetClientInternalVersion(u"2.1");
    fs::Dir::SetPrefDir(fs::Dir(ToUTF16(argv[4])));

    // 2. A service for the asset service: its address, this client's identifier and the user's token.
    ParameterList parameters;
    parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(reinterpret_cast<const unsigned char*>(argv[1])));
    parameters.emplace_back(tolmonet::kHEADER_USER_AGENT,
                            UTF8String(reinterpret_cast<const unsigned char*>("example-host")));
    parameters.emplace_back(tolmonet::kHEADER_COOKIE, UTF8String(reinterpret_cast<const unsigned char*>(argv[2])));
    const boost::shared_ptr<SyncFilesService> service = CreateSyncFilesService(SyncServiceType_Tarnvault, parameters);

    // 3. What to keep in step: every ".json" file of the folder, in the server group "Settings".
    service->RegisterSyncDirectory(SyncDir(fs::Dir(ToUTF16(argv[3])), u".json", u"Settings",
                                           ImmutableString::CreateStatic("application/json"), SyncMetadata_ModDate,
                                           kServerRecordMaxSize));

    // 4. Make the plan, then carry it out from inside the plan's callback. The
    //    callbacks share the outcome, so it lives as long as any of them.
    const auto outcome = std::make_shared<Outcome>();
    const SyncErrorCallback failed = [outcome](const UTF16String& text) { outcome->Finish(false, ToNarrow(text)); };
    const bool started = service->PrepareSync(
        [service, outcome, failed](const boost::shared_ptr<SyncCache>& cache) {
            service->DoSync(
                cache,
                [outcome, cache](int moved) {
                    outcome->Finish(true, std::to_string(moved) + " file(s) moved (" +
                                              std::to_string(cache->mUploadCount) + " up, " +
                                              std::to_string(cache->mDownloadCount) + " down)");
                },
                failed, SyncMode_TwoWay);
        },
        failed, ProgressCallback(), ItemToFileCallback());
    if (!started) {
        std::cerr << "sync could not start\n";
        return 1;
    }

    // 5. The outcome.
    std::string text;
    const bool ok = outcome->Wait(text);
    std::cout << (ok ? "synced: " : "sync failed: ") << text << "\n";
    return ok ? 0 : 1;
}
