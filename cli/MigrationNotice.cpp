#include "cli/MigrationNotice.h"

#include "foundation/core/Strings.h"
#include "tarnvault/Tarnvault.h"

namespace tolmonetsync {
namespace cli {

namespace {

boost::shared_ptr<tarnvault::Tarnvault> ClientOf(const boost::shared_ptr<SyncFilesService>& service)
{
    return boost::dynamic_pointer_cast<tarnvault::Tarnvault>(service->GetApi());
}

}  // namespace

MigrationNotice::MigrationNotice(const boost::shared_ptr<SyncFilesService>& service)
    : mService(service), mHeard(std::make_shared<Heard>())
{
    const boost::shared_ptr<tarnvault::Tarnvault> client = ClientOf(mService);
    if (!client) return;
    // The callback runs on the completion thread and may outlive this object
    // by a handler still in flight: it holds what it writes.
    const std::shared_ptr<Heard> heard = mHeard;
    client->SetMigrationStartedCallback([heard](const UTF16String& version, const UTF16String& rootName) {
        std::lock_guard<std::mutex> lock(heard->mMutex);
        if (!heard->mVersion.empty()) return;
        heard->mVersion = tolmocore::utility::ToNarrow(version);
        heard->mRootName = tolmocore::utility::ToNarrow(rootName);
    });
}

MigrationNotice::~MigrationNotice()
{
    const boost::shared_ptr<tarnvault::Tarnvault> client = ClientOf(mService);
    if (client) client->SetMigrationStartedCallback(tarnvault::Tarnvault::MigrationStartedCallback());
}

std::string MigrationNotice::FromVersion() const
{
    std::lock_guard<std::mutex> lock(mHeard->mMutex);
    return mHeard->mVersion;
}

std::string MigrationNotice::FromRootName() const
{
    std::lock_guard<std::mutex> lock(mHeard->mMutex);
    return mHeard->mRootName;
}

}  // namespace cli
}  // namespace tolmonetsync
