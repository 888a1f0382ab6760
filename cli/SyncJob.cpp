#include "cli/SyncJob.h"

#include <chrono>
#include <filesystem>
#include <memory>

#include <unistd.h>
#include <boost/json/serialize.hpp>

#include "cli/MigrationNotice.h"
#include "cli/PrintableName.h"
#include "cli/ProgressBar.h"
#include "cli/SyncReport.h"
#include "cli/SyncRun.h"
#include "cli/TransferCounter.h"
#include "foundation/net/HeaderConstants.h"
#include "sync/SyncDecision.h"
#include "sync/SyncFilesService.h"

namespace tolmonetsync {
namespace cli {

namespace {

using tolmocore::utility::ToNarrow;

}  // namespace

ParameterList MakeJobParameters(const SyncJob& job)
{
    ParameterList parameters;
    auto add = [&](const ImmutableString& key, const std::string& value) {
        parameters.emplace_back(key, UTF8String(value.begin(), value.end()));
    };
    if (!job.mServer.empty()) add(tolmonet::kHEADER_LOCATION, job.mServer);
    add(tolmonet::kHEADER_USER_AGENT, job.mClientId);
    if (!job.mToken.empty()) add(tolmonet::kHEADER_COOKIE, job.mToken);
    if (job.mAutoLogin) add(tolmonet::kHEADER_SET_COOKIE, "auto");
    for (const std::string& form : job.mMigrate) add(tolmonet::kHEADER_CACHECONTROL, "migrate-" + form);
    return parameters;
}

namespace {

std::size_t CountFiles(const Dir& dir)
{
    std::error_code error;
    std::size_t count = 0;
    for (std::filesystem::directory_iterator it(ToNarrow(dir.FullPath()), error), end; !error && it != end;
         it.increment(error))
        if (it->is_regular_file(error)) ++count;
    return count;
}

// Prints the end of a job in the chosen form and gives its exit status.
class JobReport {
public:
    JobReport(const SyncJob& job, Output output, std::ostream& out, std::ostream& err)
        : mOutput(output), mMode(job.mMode), mEveryFile(job.mEveryFile), mOut(out), mErr(err)
    {
        mJson["mode"] = ModeName(job.mMode);
        mJson["dryRun"] = job.mDryRun;
    }
    void Plan(const SyncPreview& preview)
    {
        if (mOutput == Output::Text) PrintPlan(mOut, preview, mEveryFile);
        if (mOutput == Output::Json) mJson["plan"] = PlanToJson(preview);
    }
    void Migrated(const std::string& version, const std::string& oldRootName, const boost::shared_ptr<SyncCache>& cache,
                  const std::vector<SyncDecision>& plan)
    {
        SyncPreview after;
        after.mMode = mMode;
        after.mCache = cache;
        after.mDecisions = plan;
        if (mOutput == Output::Text) {
            mOut << "migration: this host version had no preferences on the server; version " << version << "'s ("
                 << PrintableName(oldRootName) << ") were copied into its new root. The plan now:\n";
            PrintPlan(mOut, after, mEveryFile);
        }
        mJson["migratedFrom"] = version;
        if (mOutput == Output::Json) mJson["planAfterMigration"] = PlanToJson(after);
    }
    int Done(const SyncSummary* summary)
    {
        if (summary != nullptr && mOutput == Output::Text) PrintSummary(mOut, *summary);
        if (summary != nullptr) mJson["result"] = SummaryToJson(*summary);
        mJson["ok"] = true;
        Flush();
        return 0;
    }
    int Fail(const std::string& why)
    {
        // The reason may quote a server's answer or a name; JSON keeps it exact.
        mErr << "tolmonetsync sync: " << PrintableName(why) << std::endl;
        mJson["ok"] = false;
        mJson["error"] = why;
        Flush();
        return 1;
    }

private:
    void Flush()
    {
        if (mOutput == Output::Json) mOut << boost::json::serialize(mJson) << std::endl;
        mOut.flush();
    }

    Output mOutput;
    SyncMode mMode;
    bool mEveryFile;
    std::ostream& mOut;
    std::ostream& mErr;
    boost::json::object mJson;
};

SyncSummary Summarise(const SyncCache& cache, const std::vector<SyncDecision>& plan, std::size_t removedLocally)
{
    SyncSummary summary;
    summary.mUploaded = cache.mUploadCount;
    summary.mDownloaded = cache.mDownloadCount;
    for (const SyncDecision& decision : plan)
        if (decision.mAction == SyncAction_DeleteRemote) ++summary.mDeletedOnServer;
    summary.mRemovedLocally = removedLocally;
    const std::size_t moved = summary.mUploaded + summary.mDownloaded + summary.mDeletedOnServer;
    summary.mLeftAlone = cache.mFiles.size() > moved ? cache.mFiles.size() - moved : 0;
    summary.mBackupDir = ToNarrow(cache.mBackupDir.FullPath());
    summary.mBackedUp = CountFiles(cache.mBackupDir);
    return summary;
}

}  // namespace

const char* ModeName(SyncMode mode)
{
    switch (mode) {
        case SyncMode_ServerWins:
            return "server-wins";
        case SyncMode_LocalWins:
            return "local-wins";
        case SyncMode_TwoWay:
            break;
    }
    return "two-way";
}

bool ParseModeName(const std::string& text, SyncMode& mode)
{
    for (SyncMode candidate : {SyncMode_TwoWay, SyncMode_ServerWins, SyncMode_LocalWins}) {
        if (text == ModeName(candidate)) {
            mode = candidate;
            return true;
        }
    }
    return false;
}

int RunSyncJob(const SyncJob& job, Output output, std::ostream& out, std::ostream& err)
{
    JobReport report(job, output, out, err);
    const bool showProgress = output == Output::Text && isatty(STDOUT_FILENO) == 1;
    if (showProgress) InstallTransferCounter();
    boost::shared_ptr<SyncFilesService> service;
    try {
        service = CreateSyncFilesService(SyncServiceType_Tarnvault, MakeJobParameters(job));
    } catch (const std::exception& e) {
        return report.Fail(e.what());
    }
    if (job.mToken.empty() && !job.mAutoLogin) {
        // The stored sign-in, proved before anything else is asked.
        const SyncServer_ConnectionState state = WaitForConnectionState(
            [&](const ConnectionStateCallback& report) { return service->GetApi()->CheckConnection(report); });
        if (state == SyncServer_NotLoggedIn)
            return report.Fail("not signed in: run 'tolmonetsync login', give --token or set TOLMONETSYNC_TOKEN");
        if (state != SyncServer_Connected)
            return report.Fail(
                "the stored sign-in was refused or the service could not be reached "
                "(connection-failed): sign in again or check --server");
    }
    for (const SyncDir& dir : job.mDirs) {
        if (!service->RegisterSyncDirectory(dir)) {
            err << "tolmonetsync sync: --dir " << PrintableName(ToNarrow(dir.mDir.FullPath())) << " is given twice"
                << std::endl;
            return 2;
        }
    }
    for (const SyncFile& file : job.mFiles) {
        if (!service->RegisterSyncFile(file)) {
            err << "tolmonetsync sync: --file " << PrintableName(ToNarrow(file.mFile.FullPath())) << " is given twice"
                << std::endl;
            return 2;
        }
    }

    // The pass checks them again on the plan it carries out.
    service->SetMaxDelete(job.mLimits.mMaxDelete);
    service->SetMaxOverwrite(job.mLimits.mMaxOverwrite);

    ProgressBar bar(out, output == Output::Text && isatty(STDOUT_FILENO) == 1);
    const RunOutcome preview = RunPreview(*service, job.mMode);
    if (!preview.mStarted) return report.Fail("could not send the first request");
    if (!preview.Ok()) return report.Fail(preview.mError);
    report.Plan(*preview.mPreview);
    if (job.mDryRun) return report.Done(nullptr);

    // Before the prepare, which already deletes and creates groups; the
    // items of groups the guard below keeps count too.
    const std::string overLimit = preview.mPreview->ExceededLimit();
    if (!overLimit.empty()) return report.Fail(overLimit);

    // Deleting a group deletes everything in it: only on request.
    if (!preview.mPreview->mGroupsToDelete.empty() && !job.mPruneGroups)
        return report.Fail("refusing to delete server groups that no --dir or --file names: " +
                           JoinGroupNames(preview.mPreview->mGroupsToDelete) + " (give --prune-groups to delete them)");

    // Preparing may make the preferences root and copy an earlier version's into it.
    std::unique_ptr<MigrationNotice> notice;
    if (!job.mMigrate.empty()) notice.reset(new MigrationNotice(service));
    const RunOutcome prepared =
        RunPrepare(*service, ProgressCallback(), [&] { bar.Draw("preparing", service->Progress()); });
    if (!prepared.mStarted)
        return report.Fail(prepared.mError.empty() ? "could not send the first request" : prepared.mError);
    if (!prepared.Ok()) return report.Fail(prepared.mError);
    // The plan the pass carries out, for the summary's counts.
    const boost::shared_ptr<SyncCache>& cache = prepared.mCache;
    std::vector<SyncDecision> plan;
    for (const CachedSyncFile& record : cache->mFiles) plan.push_back(DecideRecord(*cache, record, job.mMode));
    // A migration filled the new root after the preview: show the plan again.
    if (notice && !notice->FromVersion().empty())
        report.Migrated(notice->FromVersion(), notice->FromRootName(), cache, plan);
    notice.reset();
    const std::size_t removals = job.mMode == SyncMode_ServerWins ? ServerWinsRemovals(*cache, job.mDirs).size() : 0;

    service->SetKeepServerCopies(job.mKeepServerCopies);
    const std::uint64_t bytesBefore = TransferredBytes();
    const auto passStart = std::chrono::steady_clock::now();
    const RunOutcome passed = RunPass(*service, cache, job.mMode, [&] {
        const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - passStart;
        bar.DrawTransfer("syncing  ", service->Progress(), cache->mFiles.size(), TransferredBytes() - bytesBefore,
                         elapsed.count());
    });
    bar.Clear();
    if (!passed.Ok()) return report.Fail(passed.mError.empty() ? "the sync did not finish" : passed.mError);
    const SyncSummary summary = Summarise(*cache, plan, removals);
    return report.Done(&summary);
}

}  // namespace cli
}  // namespace tolmonetsync
