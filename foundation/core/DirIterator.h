#pragma once
// The iterator of a directory walk (Dir::BeginFiles, Dir::BeginSubdirs).
// Begin takes a snapshot of the names, so the walk is stable whatever happens
// on disk meanwhile; an entry may be gone by the time it is used.

#include <cstddef>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace filesupport {

class Dir;

namespace detail {

struct DirSnapshot {
    UTF16String mDirPath;
    std::vector<UTF16String> mNames;  // sorted by the bytes of their UTF-8 form
};

}  // namespace detail

// Entry is File or Dir; each is made as Entry(Dir(directory), name).
template <class Entry>
class DirIterator {
public:
    // The end of any walk.
    DirIterator() : mIndex(0) {}
    explicit DirIterator(boost::shared_ptr<const detail::DirSnapshot> snapshot)
        : mSnapshot(std::move(snapshot)), mIndex(0)
    {
    }

    Entry operator*() const { return Entry(Dir(mSnapshot->mDirPath), mSnapshot->mNames[mIndex]); }

    DirIterator& operator++()
    {
        ++mIndex;
        return *this;
    }

    // Any two exhausted iterators are equal, so a walk ends at End...().
    bool operator==(const DirIterator& other) const
    {
        if (AtEnd() || other.AtEnd()) return AtEnd() == other.AtEnd();
        return mSnapshot == other.mSnapshot && mIndex == other.mIndex;
    }
    bool operator!=(const DirIterator& other) const { return !(*this == other); }

private:
    bool AtEnd() const { return !mSnapshot || mIndex >= mSnapshot->mNames.size(); }

    boost::shared_ptr<const detail::DirSnapshot> mSnapshot;
    std::size_t mIndex;
};

}  // namespace filesupport
}  // namespace tolmocore
