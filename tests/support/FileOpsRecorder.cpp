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
        if (Fails("open", path, path)) return -1;
        const int fd = FileOps::Open(path, flags, mode);
        const int error = errno;
        {
            std::lock_guard<std::mutex> lock(mMutex);
            if (fd >= 0) mPaths[fd] = path;
            mLines.push_back("open " + path);
        }
        errno = error;
        return fd;
    }
    ssize_t Write(int fd, const void* data, size_t size) override
    {
        if (Fails("write", PathOf(fd), PathOf(fd))) return -1;
        Record("write " + PathOf(fd));
        return FileOps::Write(fd, data, size);
    }
    int Fsync(int fd) override
    {
        if (Fails("fsync", PathOf(fd), PathOf(fd))) return -1;
        Record("fsync " + PathOf(fd));
        return FileOps::Fsync(fd);
    }
    int Close(int fd) override
    {
        const std::string path = PathOf(fd);
        {
            std::lock_guard<std::mutex> lock(mMutex);
            mPaths.erase(fd);
        }
        if (Fails("close", path, path)) {
            const int error = errno;
            ::close(fd);  // a failed close still lets the descriptor go
            errno = error;
            return -1;
        }
        Record("close " + path);
        return FileOps::Close(fd);
    }
    int Rename(const std::string& from, const std::string& to) override
    {
        if (Fails("rename", from, to)) return -1;
        Record("rename " + from + " -> " + to);
        return FileOps::Rename(from, to);
    }
    int SyncDirectory(const std::string& path) override
    {
        if (Fails("dirsync", path, path)) return -1;
        Record("dirsync " + path);
        return FileOps::SyncDirectory(path);
    }
    int Fchmod(int fd, mode_t mode) override
    {
        if (Fails("chmod", PathOf(fd), PathOf(fd))) return -1;
        char octal[8];
        std::snprintf(octal, sizeof octal, "%04o", static_cast<unsigned>(mode & 07777));
        Record("chmod " + PathOf(fd) + " " + octal);
        return FileOps::Fchmod(fd, mode);
    }
    int Fchown(int fd, uid_t owner, gid_t group) override
    {
        if (Fails("chown", PathOf(fd), PathOf(fd))) return -1;
        Record("chown " + PathOf(fd));
        return FileOps::Fchown(fd, owner, group);
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
    std::string PathOf(int fd) const
    {
        std::lock_guard<std::mutex> lock(mMutex);
        auto found = mPaths.find(fd);
        return found == mPaths.end() ? "fd:" + std::to_string(fd) : found->second;
    }
    void Record(const std::string& line)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mLines.push_back(line);
    }
    // Takes the first planted failure that matches, records it and sets errno.
    bool Fails(const char* kind, const std::string& path, const std::string& otherPath)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        for (auto it = mFailures.begin(); it != mFailures.end(); ++it) {
            if (it->mKind != kind || !(EndsWith(path, it->mPathEnd) || EndsWith(otherPath, it->mPathEnd))) continue;
            if (!it->mAfter.empty() && std::find(mLines.begin(), mLines.end(), it->mAfter) == mLines.end()) continue;
            const int error = it->mError;
            mLines.push_back(std::string(kind) + " " + (EndsWith(path, it->mPathEnd) ? path : otherPath) + " FAILED");
            mFailures.erase(it);
            errno = error;
            return true;
        }
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
    for (int i = from < 0 ? 0 : from; i < static_cast<int>(lines.size()); ++i)
        if (lines[i] == line) return i;
    return -1;
}

int FileOpsRecorder::IndexOfPrefix(const std::string& prefix, int from) const
{
    const std::vector<std::string> lines = Lines();
    for (int i = from < 0 ? 0 : from; i < static_cast<int>(lines.size()); ++i)
        if (lines[i].compare(0, prefix.size(), prefix) == 0) return i;
    return -1;
}

}  // namespace testsupport
