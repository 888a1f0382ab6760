#include "ServiceFixture.h"

#include "assets/AssetJSON.h"
#include "foundation/json/JSONText.h"

namespace servertest {

const char kCollectionType[] = "application/vnd.halvane.tarnvault.collection";
const char kPreferencesType[] = "application/vnd.halvane.tarnvault.collection.preferences";
const char kRootType[] = "application/vnd.halvane.tarnvault.collection.root";
const std::vector<std::string> kJson = {"Content-Type: application/json"};

ServiceTest::ServiceTest(const testsupport::TestService::Customise& customise) : mService(customise) {}

void ServiceTest::Restart()
{
    mAlice.reset();
    mBob.reset();
    mService.Restart();
    mAlice = Client(kAliceToken);
    mBob = Client(kBobToken);
}

std::string ServiceTest::ClientRoot(ServiceClient& client, const std::string& clientId)
{
    const Reply reply = client.Send("GET", "/collections?name=" + Quote(clientId));
    EXPECT_EQ(200, reply.mStatus) << reply.mBody;
    const std::vector<std::string> ids = Ids(reply);
    EXPECT_EQ(1u, ids.size());
    return ids.empty() ? std::string() : ids.front();
}

std::string ServiceTest::CreateCollection(ServiceClient& client, const std::string& name, const std::string& type)
{
    const std::string body = "{\"header\":{\"name\":\"" + name + "\",\"type\":\"" + type + "\"}}";
    const Reply reply = client.Send("POST", "/collections", body, kJson);
    EXPECT_EQ(201, reply.mStatus) << reply.mBody;
    return IdFromLocation(reply.Header("Location"));
}

void ServiceTest::AddMember(ServiceClient& client, const std::string& collectionId, const std::string& path)
{
    const Reply reply = client.Send("PUT", "/collections/" + collectionId + "/members", "[\"" + path + "\"]", kJson);
    EXPECT_EQ(200, reply.mStatus) << reply.mBody;
}

std::string ServiceTest::Upload(ServiceClient& client, const std::string& collectionId, const std::string& name,
                                const std::string& bytes, const std::string& type)
{
    const Reply reply = client.Send("POST", "/assets?name=" + Quote(name) + Into(collectionId), bytes,
                                    {"Content-Type: " + type, "X-Persistence-Policy: ethereal"});
    EXPECT_EQ(201, reply.mStatus) << reply.mBody;
    EXPECT_FALSE(reply.Header("ETag").empty());
    return IdFromLocation(reply.Header("Location"));
}

Reply ServiceTest::Search(ServiceClient& client, const std::string& query, const std::string& scopes)
{
    std::string path = "/search?q=" + Quote(query) + "&metadata=true";
    if (!scopes.empty()) path += "&scope=" + Quote(scopes);
    return client.Send("POST", path);
}

std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > ServiceTest::Assets(const Reply& reply)
{
    using namespace tolmocore::serialization;
    return JSONConvert<std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > >::FromJSON(
        JSONParse(UTF8String(reply.mBody)));
}

std::vector<std::string> ServiceTest::Ids(const Reply& reply)
{
    std::vector<std::string> ids;  // a body the client cannot read throws, and so fails the test
    for (const auto& asset : Assets(reply)) ids.push_back(asset->mId.ToStdString());
    return ids;
}

std::string IdFromLocation(const std::string& location)
{
    const std::size_t slash = location.rfind('/');
    return slash == std::string::npos ? std::string() : location.substr(slash + 1);
}

std::string Into(const std::string& collectionId)
{
    return "&collections=" + Quote("[\"/api/collections/" + collectionId + "\"]");
}

}  // namespace servertest
