#include "cli/SyncReport.h"

#include <iomanip>
#include <map>

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

std::string Printable(const std::string& text)
{
    return PrintableName(text);
}

std::string RecordName(const CachedSyncFile& record)
{
    return Printable(record.mCollectionName) + "/" + Printable(record.mName);
}

// Plans longer than this are summarised unless every file is asked for.
constexpr std::size_t kScreenfulOfLines = 40;

struct PlanLine {
    std::string mAction;
    std::string mText;  // printable
    const SyncRisk* mRisk;
    bool mAlwaysShown;  // a group or the root: never left out of a summary
};

boost::json::array RisksToJson(const std::vector<SyncRisk>& risks)
{
    boost::json::array list;
    for (const SyncRisk& risk : risks) {
        std::string name = ToNarrow(risk.mGroup);
        if (!risk.mName.empty()) name += "/" + ToNarrow(risk.mName);
        list.emplace_back(boost::json::object{{"kind", risk.KindName()}, {"name", name}, {"detail", risk.mDetail}});
    }
    return list;
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

void PrintPlan(std::ostream& out, const SyncPreview& preview, bool everyFile)
{
    const std::vector<SyncRisk> risks = preview.Risks();
    // Each risk marks the line of its record, removal or group.
    std::map<std::size_t, const SyncRisk*> recordRisks;
    std::map<UTF16String, const SyncRisk*, UTF16Less> groupRisks;
    std::map<UTF16String, const SyncRisk*, UTF16Less> removalRisks;
    std::vector<PlanLine> lines;
    for (const SyncRisk& risk : risks) {
        if (risk.mKind == SyncRisk_ForeignCache) lines.push_back({"warning", Printable(risk.mDetail), &risk, true});
        if (risk.mKind == SyncRisk_GroupDelete) groupRisks[risk.mGroup] = &risk;
        if (risk.mKind == SyncRisk_LocalDelete) removalRisks[risk.mFile.FullPath()] = &risk;
        if (risk.mRecord < preview.mDecisions.size()) recordRisks[risk.mRecord] = &risk;
    }
    const auto riskOf = [](const auto& risks, const auto& key) -> const SyncRisk* {
        const auto found = risks.find(key);
        return found == risks.end() ? nullptr : found->second;
    };

    const std::vector<CachedSyncFile>& records = preview.mCache->mFiles;
    if (preview.mRootMissing)
        lines.push_back({"create",
                         "the preferences root (first sync of this host version; with --migrate an earlier\n"
                         "          version's preferences are copied into it first)",
                         nullptr, true});
    for (const UTF16String& group : preview.mGroupsToDelete)
        lines.push_back({"delete",
                         "server group " + Printable(group) + ", with everything in it: no registration names it",
                         riskOf(groupRisks, group), true});
    for (const UTF16String& group : preview.mGroupsToAdd)
        lines.push_back({"create", "server group " + Printable(group), nullptr, true});
    for (const File& file : preview.mLocalRemovals)
        lines.push_back({"remove", Printable(file.FullPath()) + ": not on the server (backed up first)",
                         riskOf(removalRisks, file.FullPath()), false});
    for (std::size_t i = 0; i < records.size() && i < preview.mDecisions.size(); ++i) {
        const SyncDecision& decision = preview.mDecisions[i];
        lines.push_back(
            {decision.ActionName(), RecordName(records[i]) + ": " + decision.Reason(), riskOf(recordRisks, i), false});
    }

    const bool summarised = !everyFile && lines.size() > kScreenfulOfLines;
    if (summarised) {
        std::map<std::string, std::size_t> counts;
        for (const PlanLine& line : lines)
            if (!line.mAlwaysShown) ++counts[line.mAction];
        out << "plan of " << lines.size() << " lines in short (-v lists every file):";
        const char* separator = " ";
        for (const auto& count : counts) {
            out << separator << count.second << " " << count.first;
            separator = ", ";
        }
        out << "\n";
    }
    for (const PlanLine& line : lines) {
        if (summarised && !line.mAlwaysShown && line.mRisk == nullptr) continue;
        out << std::left << std::setw(9) << line.mAction << " " << line.mText;
        if (line.mRisk != nullptr) {
            out << " [risk " << line.mRisk->KindName();
            if (line.mRisk->mKind != SyncRisk_ForeignCache) out << ": " << Printable(line.mRisk->mDetail);
            out << "]";
        }
        out << "\n";
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
                               {"rootMissing", preview.mRootMissing},
                               {"risks", RisksToJson(preview.Risks())}};
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
