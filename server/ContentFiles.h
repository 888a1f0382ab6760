#pragma once
// Content bytes as one file per item under <data>/content. A write lands in
// a temporary sibling that is synced and renamed, and the directory is
// synced after the rename: once Write returns, the bytes survive a crash,
// and a crash before that leaves no file under the item's name.
//
// Threads: any. Errors: Write and Read throw std::runtime_error with the
// system's message; Remove ignores a missing file.

#include <string>
#include <vector>

namespace tolmonetsync {
namespace server {

class ContentFiles {
public:
    // Makes the directory; removes temporaries a crash may have left.
    explicit ContentFiles(const std::string& dataDirectory);

    void Write(const std::string& id, const std::string& bytes);
    std::string Read(const std::string& id) const;
    void Remove(const std::string& id);
    // Every item id that has a file, temporaries left out.
    std::vector<std::string> Ids() const;
    // Leftover temporaries in the directory; for tests.
    std::size_t TemporaryCount() const;
    std::string PathOf(const std::string& id) const;

private:
    std::string mDirectory;
};

}  // namespace server
}  // namespace tolmonetsync
