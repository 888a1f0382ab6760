// Who is signed in: tokens stored in the keychain under the last user, kept
// in a small file, proved by asking a throw-away client for the root.

#include <boost/bind/bind.hpp>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/Dir.h"
#include "foundation/core/HostConfig.h"
#include "foundation/core/Keychain.h"
#include "foundation/net/HeaderConstants.h"
#include "tarnvault/LastUserFile.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

using tolmocore::Keychain;
using tolmocore::filesupport::Dir;
using tolmocore::filesupport::File;
using tolmocore::utility::UTF16to8;
using tolmocore::utility::UTF8to16;

namespace {

// The host's version is part of the domain: a new version starts signed out.
UTF16String getKeyChainDomain(const char16_t* kind)
{
    using namespace tolmocore::config;
    return GetCompanyName() + u" " + GetClientName() + u" " + GetClientInternalVersion() + u" OVRA " + kind;
}

File getLastUserFile() { return File(Dir::PrefDir(), UTF16String(u"tarnvaultuser.txt")); }

void deleteCredentials(const File& file, const UTF8String& userID)
{
    try {
        if (!userID.empty()) {
            Keychain::RemovePassword(getKeyChainDomain(u"Access"), UTF8to16(userID));
            Keychain::RemovePassword(getKeyChainDomain(u"Refresh"), UTF8to16(userID));
        }
        if (file.Exists()) file.Delete();
    } catch (const std::exception&) {
    }
}

OvraCredentials loadCredentials(const File& file)
{
    OvraCredentials credentials;
    if (!file.Exists()) return credentials;
    try {
        tolmocore::filesupport::IPlatformByteStream stream(file, 0);
        const std::uint64_t length = stream.Length();
        if (length != 0) {
            if (length > kMaxJSONAnswer) throw OversizedAnswer();
            UTF8String text(static_cast<std::size_t>(length), 0);
            stream.ReadBlock(&text[0], static_cast<unsigned int>(length));
            credentials.userID = ParseLastUserText(text);
        }
        credentials.accessToken = UTF16to8(Keychain::GetPassword(getKeyChainDomain(u"Access"), UTF8to16(credentials.userID)));
        credentials.refreshToken =
            UTF16to8(Keychain::GetPassword(getKeyChainDomain(u"Refresh"), UTF8to16(credentials.userID)));
    } catch (const std::exception& e) {
        // A damaged file heals itself: it goes, and nobody counts as signed in.
        TOLMO_TRACE("Tarnvault", 1, "loadCredentials error: " << file.FullPath() << ": " << e.what());
        deleteCredentials(file, UTF8String());
        return OvraCredentials();
    }
    return credentials;
}

}  // namespace

void Tarnvault::ReportState(const ConnectionStateCallback& stateCallback, SyncServer_ConnectionState state)
{
    mConnectionState = state;
    std::uint64_t seen = 0;
    // Read back with a full barrier: the state may have been written on another thread.
    do {
        seen = __atomic_load_n(&mConnectionState, __ATOMIC_SEQ_CST);
    } while (!__atomic_compare_exchange_n(&mConnectionState, &seen, seen, false, __ATOMIC_SEQ_CST, __ATOMIC_SEQ_CST));
    stateCallback(static_cast<SyncServer_ConnectionState>(seen));
}

boost::shared_ptr<Tarnvault> Tarnvault::MakeProbe(const OvraCredentials& credentials) const
{
    ParameterList parameters;
    parameters.push_back(std::make_pair(tolmonet::kHEADER_LOCATION, mServerURL));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_USER_AGENT, mClientID));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_COOKIE, credentials.accessToken));
    boost::shared_ptr<Tarnvault> probe(new Tarnvault(parameters));
    probe->mUserID = credentials.userID;
    return probe;
}

bool Tarnvault::SetCredentials(const ConnectionStateCallback& stateCallback, const OvraCredentials& credentials)
{
    TOLMO_TRACE("Tarnvault", 8,
                "SetCredentials: inAccessToken: <obfuscated>, inRefreshToken: <obfuscated>, inUserID: "
                    << credentials.userID);
    if (!credentials.accessToken.empty()) {
        try {
            // Nothing is written into a directory that others could change.
            Dir::CheckPrefDir();
            const File file = getLastUserFile();
            file.Create(false);
            // Private, and a link planted at its name is replaced, not written through.
            tolmocore::filesupport::OPlatformByteStream stream(file, 0, 0600);
            const UTF8String text = FormatLastUserText(credentials.userID);
            stream.WriteBlock(text.data(), static_cast<unsigned int>(text.size()));
            Keychain::SetPassword(getKeyChainDomain(u"Access"), UTF8to16(credentials.userID),
                                  UTF8to16(credentials.accessToken));
            Keychain::SetPassword(getKeyChainDomain(u"Refresh"), UTF8to16(credentials.userID),
                                  UTF8to16(credentials.refreshToken));
            stream.Close();
            mAccessToken = credentials.accessToken;
            mRefreshToken = credentials.refreshToken;
            mUserID = credentials.userID;
        } catch (const std::exception& e) {
            TOLMO_TRACE("Tarnvault", 1, "OvraLogin error: " << e.what());
            mAccessToken.clear();
            mRefreshToken.clear();
            mUserID.clear();
        }
    }
    // What was just stored is what gets checked, read back.
    return CheckConnection(stateCallback);
}

bool Tarnvault::CheckConnection(const ConnectionStateCallback& stateCallback)
{
    mConnectionState = SyncServer_Checking;
    // Checked here and not in loadCredentials: its failure path deletes the
    // last-user file, and a refused directory must not sign the user out.
    try {
        Dir::CheckPrefDir();
    } catch (const std::exception& e) {
        TOLMO_TRACE("Tarnvault", 1, "CheckConnectionError: " << e.what());
        ReportState(stateCallback, SyncServer_ConnectionFailed);
        return true;
    }
    const OvraCredentials credentials = loadCredentials(getLastUserFile());
    if (credentials.accessToken.empty()) {
        ReportState(stateCallback, SyncServer_NotLoggedIn);
        return true;
    }
    // The candidate token goes through a client of its own: ours changes only
    // once the token has been proved.
    const boost::shared_ptr<Tarnvault> probe = MakeProbe(credentials);
    const boost::shared_ptr<Tarnvault> self = shared_from_this();
    const Guid sent = probe->GetRootAsync(
        boost::bind(&Tarnvault::_HandleCheckConnection, self, probe, stateCallback, boost::placeholders::_1,
                    boost::placeholders::_2),
        boost::bind(&Tarnvault::_HandleCheckConnectionError, self, probe, stateCallback, boost::placeholders::_1,
                    boost::placeholders::_2),
        Guid::CreateUnique());
    return !sent.IsNil();
}

void Tarnvault::_HandleCheckConnection(const boost::weak_ptr<Tarnvault>& self,
                                       const boost::shared_ptr<Tarnvault>& probe,
                                       const ConnectionStateCallback& stateCallback, const Guid&,
                                       const boost::shared_ptr<Collection>&)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    client->mConnectionState = SyncServer_Connected;
    client->mAccessToken = probe->mAccessToken;
    client->mUserID = probe->mUserID;
    client->ReportState(stateCallback, SyncServer_Connected);
}

void Tarnvault::_HandleCheckConnectionError(const boost::weak_ptr<Tarnvault>& self,
                                            const boost::shared_ptr<Tarnvault>&,
                                            const ConnectionStateCallback& stateCallback, const Guid& requestUID,
                                            const boost::shared_ptr<tolmonet::Response>& response)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    try {
        ThrowResponse(requestUID, response);
    } catch (const std::exception& e) {
        TOLMO_TRACE("Tarnvault", 1,
                    "CheckConnectionError: " << ", requestUID: " << requestUID << ", error: " << e.what());
    }
    client->ReportState(stateCallback, SyncServer_ConnectionFailed);
}

bool Tarnvault::Logout(const ConnectionStateCallback& stateCallback)
{
    mConnectionState = SyncServer_Checking;
    // The keychain entries stay; without the file nothing finds them.
    deleteCredentials(getLastUserFile(), UTF8String());
    mAccessToken.clear();
    mRefreshToken.clear();
    mUserID.clear();
    ReportState(stateCallback, SyncServer_NotLoggedIn);
    return true;
}

}  // namespace tarnvault
}  // namespace tolmonetsync
