#include "DecisionModel.h"

namespace modeltest {

using namespace tolmonetsync;

enum class State { Current, Push, Pull };

Outcome Predict(const World& world, SyncMode mode, bool checksums)
{
    Outcome out;
    for (const auto& [name, item] : world.mRemote) out.mRemote[name] = item.mBytes;
    for (const auto& [name, file] : world.mLocal) out.mLocal[name] = file.mBytes;

    // Server-wins first removes, backed up, what a group with items lacks.
    if (mode == SyncMode_ServerWins && !world.mRemote.empty())
        for (const auto& [name, file] : world.mLocal)
            if (world.mRemote.count(name) == 0) {
                out.mBackups[name] = file.mBytes;
                out.mLocal.erase(name);
            }

    std::set<std::string> names;
    for (const auto& entry : world.mLocal) names.insert(entry.first);
    for (const auto& entry : world.mRemote) names.insert(entry.first);
    for (const std::string& name : names) {
        const auto planned = world.mLocal.find(name);
        const auto remote = world.mRemote.find(name);
        const bool fromFolder = planned != world.mLocal.end();
        const bool onServer = remote != world.mRemote.end();
        const bool existsNow = out.mLocal.count(name) != 0;
        // Records made from a server item alone are always compared by date.
        const bool byChecksum = checksums && fromFolder;

        // The cache file counts only for a file that is there.
        CachedEntry record;
        if (fromFolder && world.mCache.count(name) != 0) record = world.mCache.at(name);
        const bool changed = byChecksum ? record.mLocalChecksum != planned->second.mBytes
                                        : fromFolder && record.mLocalModified != planned->second.mModified;
        // With no history on one side the file's presence decides; then a
        // local change pushes; then the mode.
        State state = State::Pull;
        if (record.mServerDate.empty() || !onServer)
            state = existsNow ? State::Push : State::Pull;
        else if (changed)
            state = State::Push;
        else if (mode == SyncMode_LocalWins && record.mServerDate == remote->second.mEtag)
            state = State::Current;
        // What the plan read of the file is what the save keeps.
        record.mLocalModified.reset();
        record.mLocalChecksum.reset();
        if (byChecksum)
            record.mLocalChecksum = planned->second.mBytes;
        else if (fromFolder)
            record.mLocalModified = planned->second.mModified;

        bool upload = false;
        bool download = false;
        if (state == State::Current) {
        } else if (mode == SyncMode_LocalWins) {
            upload = true;
        } else if (mode == SyncMode_ServerWins) {
            download = true;
            if (state == State::Push) record.mEtag.clear();
        } else {
            (state == State::Push ? upload : download) = true;
        }

        if (upload && existsNow) {
            out.mRemote[name] = out.mLocal[name];
            out.mUploaded.insert(name);
        } else if (upload && onServer && mode == SyncMode_LocalWins) {
            out.mRemote.erase(name);
        }
        if (download && onServer) {
            record.mServerDate = remote->second.mEtag;
            // A tag the server still has brings nothing.
            if (record.mEtag != remote->second.mEtag) {
                if (existsNow) out.mBackups[name] = out.mLocal[name];
                out.mLocal[name] = remote->second.mBytes;
                record.mEtag = remote->second.mEtag;
                out.mDownloaded.insert(name);
                if (byChecksum)
                    record.mLocalChecksum = remote->second.mBytes;
                else
                    out.mFreshDates.insert(name);
            }
        }
        out.mCache[name] = record;
    }
    return out;
}

}  // namespace modeltest
