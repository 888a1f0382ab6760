// The doctor's look at the registered folders: are they there, what did an
// interrupted download or write leave behind, and which names clash.

#include <unistd.h>

#include <map>
#include <set>

#include "cli/DoctorChecks.h"
#include "cli/NameForms.h"
#include "cli/PrintableName.h"

namespace tolmonetsync {
namespace cli {

namespace {

namespace fs = std::filesystem;
using tolmocore::utility::ToNarrow;

bool EndsWith(const std::string& text, const std::string& end)
{
    return text.size() >= end.size() && text.compare(text.size() - end.size(), end.size(), end) == 0;
}

// The directories the registrations look into, each once, in order.
std::vector<fs::path> RegisteredFolders(const DoctorSetup& setup)
{
    std::vector<fs::path> folders;
    std::set<fs::path> seen;
    for (const SyncDir& dir : setup.mDirs)
        if (seen.insert(ToNarrow(dir.mDir.FullPath())).second) folders.push_back(ToNarrow(dir.mDir.FullPath()));
    for (const SyncFile& file : setup.mFiles) {
        const fs::path parent = fs::path(ToNarrow(file.mFile.FullPath())).parent_path();
        if (seen.insert(parent).second) folders.push_back(parent);
    }
    return folders;
}

// Names of the regular files of `folder`; empty if it cannot be read.
std::vector<std::string> FileNames(const fs::path& folder)
{
    std::vector<std::string> names;
    std::error_code error;
    for (fs::directory_iterator it(folder, error), end; !error && it != end; it.increment(error))
        if (it->is_regular_file(error)) names.push_back(it->path().filename().string());
    return names;
}

// ".NAME.tmsw-XXXXXX": the sibling an atomic write renames over NAME.
bool IsWriteTemporary(const std::string& name)
{
    const std::size_t marker = name.rfind(".tmsw-");
    return name.size() > 1 && name[0] == '.' && marker != std::string::npos && marker > 1 &&
           name.size() == marker + 6 + 6;
}

// Whether a registration would own a file of this name in `folder`.
bool IsRegisteredName(const DoctorSetup& setup, const fs::path& folder, const std::string& name)
{
    for (const SyncDir& dir : setup.mDirs)
        if (fs::path(ToNarrow(dir.mDir.FullPath())) == folder && EndsWith(name, ToNarrow(dir.mExtension))) return true;
    for (const SyncFile& file : setup.mFiles)
        if (fs::path(ToNarrow(file.mFile.FullPath())) == folder / name) return true;
    return false;
}

std::string Listed(const std::vector<std::string>& names)
{
    std::string text;
    for (std::size_t i = 0; i < names.size() && i < 3; ++i) text += (i > 0 ? ", " : "") + PrintableName(names[i]);
    return names.size() > 3 ? text + ", ..." : text;
}

}  // namespace

DoctorFinding CheckDirectories(const DoctorSetup& setup)
{
    DoctorFinding finding{"directories", false, std::string()};
    std::vector<std::string> missing;
    std::vector<std::string> unreadable;
    const std::vector<fs::path> folders = RegisteredFolders(setup);
    for (const fs::path& folder : folders) {
        std::error_code error;
        if (!fs::is_directory(folder, error)) {
            missing.push_back(folder.string());
        } else if (::access(folder.c_str(), R_OK | X_OK) != 0) {
            unreadable.push_back(folder.string());
        }
    }
    finding.mAttention = !missing.empty() || !unreadable.empty();
    if (!finding.mAttention) finding.mDetail = std::to_string(folders.size()) + " registered, all readable";
    if (!missing.empty()) finding.mDetail = "missing: " + Listed(missing);
    if (!unreadable.empty())
        finding.mDetail += std::string(missing.empty() ? "" : "; ") + "unreadable: " + Listed(unreadable);
    return finding;
}

DoctorFinding CheckLeftovers(const DoctorSetup& setup)
{
    DoctorFinding finding{"leftovers", false, std::string()};
    std::vector<std::string> downloads;
    std::vector<std::string> writes;
    for (const fs::path& folder : RegisteredFolders(setup)) {
        for (const std::string& name : FileNames(folder)) {
            if (EndsWith(name, ".temp") && IsRegisteredName(setup, folder, name.substr(0, name.size() - 5)))
                downloads.push_back((folder / name).string());
            else if (IsWriteTemporary(name) &&
                     IsRegisteredName(setup, folder, name.substr(1, name.rfind(".tmsw-") - 1)))
                writes.push_back((folder / name).string());
        }
    }
    finding.mAttention = !downloads.empty() || !writes.empty();
    if (!finding.mAttention) finding.mDetail = "none";
    if (!downloads.empty())
        finding.mDetail = std::to_string(downloads.size()) + " unfinished download(s): " + Listed(downloads);
    if (!writes.empty())
        finding.mDetail += std::string(downloads.empty() ? "" : "; ") + std::to_string(writes.size()) +
                           " temporary file(s) of an interrupted write: " + Listed(writes);
    if (finding.mAttention) finding.mDetail += " (safe to delete once no sync runs)";
    return finding;
}

DoctorFinding CheckNames(const DoctorSetup& setup)
{
    DoctorFinding finding{"names", false, std::string()};
    std::vector<std::string> clashes;
    // Per group: the names the sync would give the server, by their folded form.
    std::map<std::string, std::map<std::string, std::set<std::string> > > byGroup;
    for (const SyncDir& dir : setup.mDirs) {
        const fs::path folder = ToNarrow(dir.mDir.FullPath());
        auto& names = byGroup[ToNarrow(dir.mCollectionName)];
        for (const std::string& name : FileNames(folder))
            if (EndsWith(name, ToNarrow(dir.mExtension)) && !IsWriteTemporary(name))
                names[NameFoldKey(name)].insert(name);
    }
    for (const SyncFile& file : setup.mFiles)
        byGroup[ToNarrow(file.mCollectionName)][NameFoldKey(ToNarrow(file.mName))].insert(ToNarrow(file.mName));
    for (const auto& group : byGroup) {
        for (const auto& same : group.second) {
            if (same.second.size() < 2) continue;
            std::string line = PrintableName(group.first) + ": ";
            for (const std::string& name : same.second)
                line += (&name == &*same.second.begin() ? "" : " and ") + PrintableName(name);
            clashes.push_back(line);
        }
    }
    finding.mAttention = !clashes.empty();
    finding.mDetail = clashes.empty() ? "no two names differ only in case or Unicode form"
                                      : "differing only in case or Unicode form (another computer may keep one): ";
    for (std::size_t i = 0; i < clashes.size() && i < 3; ++i) finding.mDetail += (i > 0 ? "; " : "") + clashes[i];
    if (clashes.size() > 3) finding.mDetail += "; ...";
    return finding;
}

}  // namespace cli
}  // namespace tolmonetsync
