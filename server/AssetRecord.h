#pragma once
// One asset as the service stores it, the three collection media types, and
// the failure a store operation ends with.

#include <cstdint>
#include <stdexcept>
#include <string>

namespace tolmonetsync {
namespace server {

extern const char kMediaRoot[];
extern const char kMediaCollection[];
extern const char kMediaPreferences[];
extern const char kMediaDefaultContent[];

// True for the three collection media types, compared whole.
bool IsCollectionMediaType(const std::string& mediaType);

struct AssetRecord {
    std::string mId;
    bool mCollection = false;
    std::string mMediaType;  // a collection's kind or an item's content type
    std::string mName;
    std::int64_t mSize = 0;
    std::string mEtag;           // quoted; items only
    std::int64_t mCreated = 0;   // microseconds since 1970, UTC
    std::int64_t mModified = 0;  // the same
    bool mTrashed = false;
    bool mClientRoot = false;
};

// A request the store refuses: the HTTP status and one line for people.
class StoreFailure : public std::runtime_error {
public:
    StoreFailure(int status, const std::string& text) : std::runtime_error(text), mStatus(status) {}
    int Status() const { return mStatus; }

private:
    int mStatus;
};

}  // namespace server
}  // namespace tolmonetsync
