#include "foundation/core/HostConfig.h"

#include <mutex>

namespace tolmocore {
namespace config {
namespace {

// The values are set once by the host before any reader runs; the mutex
// keeps a late setter from tearing a value a reader is copying.
struct HostIdentity {
    std::mutex mMutex;
    UTF16String mClientName;
    UTF16String mClientVersion;
    UTF16String mCompanyName;
};

HostIdentity& Identity()
{
    static HostIdentity* identity = new HostIdentity;  // outlives static destructors
    return *identity;
}

}  // namespace

const UTF16String& GetClientName()
{
    std::lock_guard<std::mutex> lock(Identity().mMutex);
    return Identity().mClientName;
}

const UTF16String& GetClientInternalVersion()
{
    std::lock_guard<std::mutex> lock(Identity().mMutex);
    return Identity().mClientVersion;
}

const UTF16String& GetCompanyName()
{
    std::lock_guard<std::mutex> lock(Identity().mMutex);
    return Identity().mCompanyName;
}

void SetClientName(const UTF16String& name)
{
    std::lock_guard<std::mutex> lock(Identity().mMutex);
    Identity().mClientName = name;
}

void SetClientInternalVersion(const UTF16String& version)
{
    std::lock_guard<std::mutex> lock(Identity().mMutex);
    Identity().mClientVersion = version;
}

void SetCompanyName(const UTF16String& company)
{
    std::lock_guard<std::mutex> lock(Identity().mMutex);
    Identity().mCompanyName = company;
}

}  // namespace config
}  // namespace tolmocore
