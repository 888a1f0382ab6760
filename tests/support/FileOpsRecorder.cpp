#include "support/FileOpsRecorder.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <map>
#include <mutex>

namespace testsupport {

using tolmocore::filesupport::FileOps;

namespace {

bool EndsWith(const std::string& text, const std::string& end)
{
    return text.size() >= end.size() && text.compare(text.size() - end.size(), end.size(), end) == 0;
}

}  // namespace

class FileOpsRecorder::Recording : public FileOps {
public:
    struct Failure {
        std::string mKind;
        std::string mPathEnd;
        int mError;
        std::string mAfter;
    };

    int Open(const std::string& path, int flags, mode_t mode) override
    {
        if (Fails("open", path)) return -1;
        const int fd = FileOps::Open(path, flags, mode);
        std::lock_guard<std::mutex> lock(mMutex);
        if (fd >= 0) mPaths[fd] = path;
        return fd;
    }
    ssize_t Write(int fd, const void* data, size_t size) override
    {
        return Fails("write", PathOf(fd)) ? -1 : FileOps::Write(fd, data, size);
    }
    int Fsync(int fd) override { return Fails("fsync", PathOf(fd)) ? -1 : FileOps::Fsync(fd); }
    int Close(int fd) override
    {
        if (!Fails("close", PathOf(fd, true))) return FileOps::Close(fd);
        const int error = errno;
        ::close(fd);  // a failed close still lets the descriptor go
        errno = error;
        return -1;
    }
    int Rename(const std::string& from, const std::string& to) override
    {
        return Fails("rename", from, " -> " + to, to) ? -1 : FileOps::Rename(from, to);
    }
    int Unlink(const std::string& path) override { return Fails("unlink", path) ? -1 : FileOps::Unlink(path); }
    int SyncDirectory(const std::string& path) override
    {
        return Fails("dirsync", path) ? -1 : FileOps::SyncDirectory(path);
    }
    int Fchmod(int fd, mode_t mode) override
    {
        char octal[8];
        std::snprintf(octal, sizeof octal, " %04o", static_cast<unsigned>(mode & 07777));
        return Fails("chmod", PathOf(fd), octal) ? -1 : FileOps::Fchmod(fd, mode);
    }
    int Fchown(int fd, uid_t owner, gid_t group) override
    {
        return Fails("chown", PathOf(fd)) ? -1 : FileOps::Fchown(fd, owner, group);
    }

    void Plant(const Failure& failure)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mFailures.push_back(failure);
    }
    bool AllMet() const
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mFailures.empty();
    }
    std::vector<std::string> Lines() const
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mLines;
    }

private:
    std::string PathOf(int fd, bool forget = false)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        auto found = mPaths.find(fd);
        const std::string path = found == mPaths.end() ? "fd:" + std::to_string(fd) : found->second;
        if (forget && found != mPaths.end()) mPaths.erase(found);
        return path;
    }
    // Takes the first planted failure that matches `path` or `otherPath`,
    // records it and sets errno; otherwise records "KIND PATH DETAIL".
    bool Fails(const std::string& kind, const std::string& path, const std::string& detail = std::string(),
               const std::string& otherPath = std::string())
    {
        std::lock_guard<std::mutex> lock(mMutex);
        for (auto it = mFailures.begin(); it != mFailures.end(); ++it) {
            const std::string& matched = EndsWith(path, it->mPathEnd) ? path : otherPath;
            if (it->mKind != kind || !EndsWith(matched, it->mPathEnd)) continue;
            if (!it->mAfter.empty() && std::find(mLines.begin(), mLines.end(), it->mAfter) == mLines.end()) continue;
            mLines.push_back(kind + " " + matched + " FAILED");
            errno = it->mError;
            mFailures.erase(it);
            return true;
        }
        mLines.push_back(kind + " " + path + detail);
        return false;
    }

    mutable std::mutex mMutex;  // guards everything below
    std::map<int, std::string> mPaths;
    std::vector<std::string> mLines;
    std::vector<Failure> mFailures;
};

FileOpsRecorder::FileOpsRecorder()
    : mRecording(new Recording), mPrevious(tolmocore::filesupport::SetFileOps(mRecording))
{
}

FileOpsRecorder::~FileOpsRecorder()
{
    tolmocore::filesupport::SetFileOps(mPrevious);
}

void FileOpsRecorder::FailNext(const std::string& kind, const std::string& pathEnd, int error, const std::string& after)
{
    mRecording->Plant(Recording::Failure{kind, pathEnd, error, after});
}

bool FileOpsRecorder::AllFailuresMet() const
{
    return mRecording->AllMet();
}

std::vector<std::string> FileOpsRecorder::Lines() const
{
    return mRecording->Lines();
}

int FileOpsRecorder::IndexOf(const std::string& line, int from) const
{
    const std::vector<std::string> lines = Lines();
    const auto found = std::find(lines.begin() + std::clamp<int>(from, 0, lines.size()), lines.end(), line);
    return found == lines.end() ? -1 : static_cast<int>(found - lines.begin());
}

int FileOpsRecorder::IndexOfPrefix(const std::string& prefix, int from) const
{
    const std::vector<std::string> lines = Lines();
    const auto found =
        std::find_if(lines.begin() + std::clamp<int>(from, 0, lines.size()), lines.end(),
                     [&](const std::string& line) { return line.compare(0, prefix.size(), prefix) == 0; });
    return found == lines.end() ? -1 : static_cast<int>(found - lines.begin());
}

}  // namespace testsupport
