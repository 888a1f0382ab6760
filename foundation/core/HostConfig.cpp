#include "foundation/core/HostConfig.h"

#include <atomic>

namespace tolmocore {
namespace config {
namespace {

// Each value is an immutable string published through an atomic pointer. A
// setter publishes a new string and never frees the old one, so a reference
// a getter handed out stays valid and unchanged for the life of the process:
// a late setter cannot tear what a reader holds. Setters are rare (once per
// host start), so what is never freed is a few strings.
class PublishedString {
public:
    const UTF16String& Get() const
    {
        const Version* version = mLatest.load(std::memory_order_acquire);
        return version ? version->mValue : Empty();
    }

    void Set(const UTF16String& value)
    {
        Version* version = new Version{value, mLatest.load(std::memory_order_relaxed)};
        // A racing setter is retried so that no version drops out of the chain.
        while (!mLatest.compare_exchange_weak(version->mPrevious, version, std::memory_order_release,
                                              std::memory_order_relaxed)) {
        }
    }

private:
    // Every version stays linked from the latest, so none is ever lost.
    struct Version {
        const UTF16String mValue;
        const Version* mPrevious;
    };

    static const UTF16String& Empty()
    {
        static const UTF16String* empty = new UTF16String;  // outlives static destructors
        return *empty;
    }

    std::atomic<const Version*> mLatest{nullptr};
};

// Constant-initialised: readable before and after any static constructor runs.
PublishedString sClientName;
PublishedString sClientVersion;
PublishedString sCompanyName;

}  // namespace

const UTF16String& GetClientName()
{
    return sClientName.Get();
}

const UTF16String& GetClientInternalVersion()
{
    return sClientVersion.Get();
}

const UTF16String& GetCompanyName()
{
    return sCompanyName.Get();
}

void SetClientName(const UTF16String& name)
{
    sClientName.Set(name);
}

void SetClientInternalVersion(const UTF16String& version)
{
    sClientVersion.Set(version);
}

void SetCompanyName(const UTF16String& company)
{
    sCompanyName.Set(company);
}

}  // namespace config
}  // namespace tolmocore
