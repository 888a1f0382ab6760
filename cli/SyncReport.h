#pragma once
// What a sync prints: the plan taken from the engine's preview, and the
// summary of what the pass did; as text for a person or as JSON.

#include <cstddef>
#include <ostream>
#include <string>
#include <vector>

#include <boost/json/object.hpp>

#include "sync/SyncPreview.h"

namespace tolmonetsync {
namespace cli {

// What a finished pass did, counted from the plan it carried out.
struct SyncSummary {
    std::size_t mUploaded = 0;
    std::size_t mDownloaded = 0;
    std::size_t mDeletedOnServer = 0;
    std::size_t mRemovedLocally = 0;  // each backed up first
    std::size_t mLeftAlone = 0;
    std::string mBackupDir;
    std::size_t mBackedUp = 0;  // files in the backup directory
};

// The group changes and local removals, then one line per record ("upload
// prefs/colors.json: changed locally"); a risky line ends with "[risk KIND:
// why]". A plan longer than a screenful gives counts per action and only the
// root, group and risky lines, unless `everyFile`.
void PrintPlan(std::ostream& out, const SyncPreview& preview, bool everyFile);
void PrintSummary(std::ostream& out, const SyncSummary& summary);

boost::json::object PlanToJson(const SyncPreview& preview);
boost::json::object SummaryToJson(const SyncSummary& summary);

// "A, B" for the group names, exact: the caller escapes what it prints.
std::string JoinGroupNames(const GroupNameSet& groups);

}  // namespace cli
}  // namespace tolmonetsync
