#pragma once
// Watches the library's file operations (FileOps) for the life of the object:
// records each as one line, in the order they ran, and fails chosen ones with
// a chosen errno instead of doing them. Everything else reaches the disk.
//
// Lines: "open PATH", "write PATH", "fsync PATH", "close PATH",
// "rename FROM -> TO", "unlink PATH", "dirsync PATH", "chmod PATH 0600", "chown PATH";
// descriptors are named by the path they were opened with.

#include <cerrno>
#include <string>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "foundation/core/FileOps.h"

namespace testsupport {

class FileOpsRecorder {
public:
    FileOpsRecorder();
    ~FileOpsRecorder();
    FileOpsRecorder(const FileOpsRecorder&) = delete;
    FileOpsRecorder& operator=(const FileOpsRecorder&) = delete;

    // Fails the next operation of `kind` ("open", "write", "fsync", "close",
    // "rename", "unlink", "dirsync", "chmod", "chown") whose path ends with `pathEnd`
    // (for a rename, either path), with `error`; with `after`, only once a
    // line that is `after` has been recorded. Failed operations are recorded
    // too, with " FAILED" after them.
    void FailNext(const std::string& kind, const std::string& pathEnd, int error = EIO,
                  const std::string& after = std::string());
    // True once every planted failure has been met.
    bool AllFailuresMet() const;

    std::vector<std::string> Lines() const;
    // The index of the first line at or after `from` that is `line`, or -1.
    int IndexOf(const std::string& line, int from = 0) const;
    // The same for the first line that starts with `prefix`.
    int IndexOfPrefix(const std::string& prefix, int from = 0) const;

    class Recording;

private:
    boost::shared_ptr<Recording> mRecording;
    boost::shared_ptr<tolmocore::filesupport::FileOps> mPrevious;
};

}  // namespace testsupport
