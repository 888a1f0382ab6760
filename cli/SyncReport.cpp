#include "cli/SyncReport.h"

#include <iomanip>

#include <boost/json/array.hpp>

#include "cli/PrintableName.h"

namespace tolmonetsync {
namespace cli {

namespace {

using tolmocore::utility::ToNarrow;

// Names and paths as a terminal may show them; JSON takes them exact.
std::string Printable(const UTF16String& name)
{
    return PrintableName(ToNarrow(name));
}

std::string RecordName(const CachedSyncFile& record)
{
    return Printable(record.mCollectionName) + "/" + Printable(record.mName);
}

boost::json::array GroupsToJson(const GroupNameSet& groups)
{
    boost::json::array names;
    for (const UTF16String& name : groups) names.emplace_back(ToNarrow(name));
    return names;
}

}  // namespace

std::string JoinGroupNames(const GroupNameSet& groups)
{
    std::string text;
    for (const UTF16String& name : groups) text += (text.empty() ? "" : ", ") + ToNarrow(name);
    return text;
}

void PrintPlan(std::ostream& out, const SyncPreview& preview)
{
    const std::vector<CachedSyncFile>& records = preview.mCache->mFiles;
    if (preview.mRootMissing)
        out << "create    the preferences root (first sync of this host version; with --migrate an earlier\n"
               "          version's preferences are copied into it first)\n";
    for (const UTF16String& group : preview.mGroupsToDelete)
        out << "delete    server group " << Printable(group) << ", with everything in it: no registration names it\n";
    for (const UTF16String& group : preview.mGroupsToAdd) out << "create    server group " << Printable(group) << "\n";
    for (const File& file : preview.mLocalRemovals)
        out << "remove    " << Printable(file.FullPath()) << ": not on the server (backed up first)\n";
    for (std::size_t i = 0; i < records.size() && i < preview.mDecisions.size(); ++i) {
        const SyncDecision& decision = preview.mDecisions[i];
        out << std::left << std::setw(9) << decision.ActionName() << " " << RecordName(records[i]) << ": "
            << decision.Reason() << "\n";
    }
    if (records.empty()) out << "nothing registered has a file on either side\n";
}

void PrintSummary(std::ostream& out, const SyncSummary& summary)
{
    out << "uploaded " << summary.mUploaded << ", downloaded " << summary.mDownloaded << ", deleted "
        << summary.mDeletedOnServer << " on the server and " << summary.mRemovedLocally << " locally, left alone "
        << summary.mLeftAlone << "\n";
    if (summary.mBackedUp > 0)
        out << "backups of " << summary.mBackedUp << " replaced or removed file(s) in "
            << PrintableName(summary.mBackupDir) << "\n";
    else if (!summary.mBackupDir.empty())
        out << "no local file was replaced or removed (backup directory " << PrintableName(summary.mBackupDir)
            << " is empty)\n";
}

boost::json::object PlanToJson(const SyncPreview& preview)
{
    boost::json::array records;
    const std::vector<CachedSyncFile>& files = preview.mCache->mFiles;
    for (std::size_t i = 0; i < files.size() && i < preview.mDecisions.size(); ++i) {
        const SyncDecision& decision = preview.mDecisions[i];
        records.emplace_back(boost::json::object{{"action", decision.ActionName()},
                                                 {"reason", decision.Reason()},
                                                 {"group", ToNarrow(files[i].mCollectionName)},
                                                 {"name", ToNarrow(files[i].mName)},
                                                 {"file", ToNarrow(files[i].mFile.FullPath())}});
    }
    boost::json::array removals;
    for (const File& file : preview.mLocalRemovals) removals.emplace_back(ToNarrow(file.FullPath()));
    return boost::json::object{{"records", std::move(records)},
                               {"groupsToDelete", GroupsToJson(preview.mGroupsToDelete)},
                               {"groupsToCreate", GroupsToJson(preview.mGroupsToAdd)},
                               {"localRemovals", std::move(removals)},
                               {"rootMissing", preview.mRootMissing}};
}

boost::json::object SummaryToJson(const SyncSummary& summary)
{
    return boost::json::object{{"uploaded", summary.mUploaded},
                               {"downloaded", summary.mDownloaded},
                               {"deletedOnServer", summary.mDeletedOnServer},
                               {"removedLocally", summary.mRemovedLocally},
                               {"leftAlone", summary.mLeftAlone},
                               {"backupDir", summary.mBackupDir},
                               {"backedUp", summary.mBackedUp}};
}

}  // namespace cli
}  // namespace tolmonetsync
