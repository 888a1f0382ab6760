// Copying a subtree against a scripted service: a tree that holds itself, and
// a failed upload (the whole tree, names and types: tests/migration).

#include <cstdlib>

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

// A service that answers by route, since a level's requests arrive in any
// order. Source S holds item i1 and collection c1; c1 holds item i2.
class TreeService {
public:
    TreeService() : mServer([this](const HttpRequest& request) { return Answer(request); }) {}

    struct Upload {
        std::string mTarget, mContentType, mBody;
    };
    std::vector<Upload> Uploads()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mUploads;
    }
    std::vector<std::string> Creates()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mCreates;
    }
    std::string ApiUrl() const { return mServer.Url("/api"); }

    std::string mFailUploadOf;  // an upload whose target holds this fails with 500
    bool mCycle = false;        // c1 holds S too, and itself: a tree no copy may follow round

private:
    HttpAnswer Answer(const HttpRequest& request)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        const std::string target = Decode(request.mTarget);
        HttpAnswer answer;
        if (request.mMethod == "POST" && target.rfind("/api/search?", 0) == 0) {
            if (target.find(R"(scope=["/collections/S"])") != std::string::npos)
                answer.mBody = "[" + ItemJSON("i1", "a.txt") + "," + CollectionJSON("c1", "sub") + "]";
            else if (target.find(R"(scope=["/collections/c1"])") != std::string::npos)
                answer.mBody = "[" + ItemJSON("i2", "b.txt") +
                               (mCycle ? "," + CollectionJSON("S", "again") + "," + CollectionJSON("c1", "self") : "") +
                               "]";
            else
                answer.mBody = "[]";
        } else if (request.mMethod == "GET" && (target == "/api/assets/i1" || target == "/api/assets/i2")) {
            answer.mBody = target == "/api/assets/i1" ? "one" : "two";
            answer.mHeaders = {{"Content-Type", target == "/api/assets/i1" ? "text/x-one" : "text/x-two"}};
        } else if (request.mMethod == "POST" && target == "/api/collections") {
            mCreates.push_back(request.mBody);
            answer.mStatus = 201;
            answer.mHeaders = {{"Location", "/api/collections/new" + std::to_string(mCreates.size())}};
        } else if (request.mMethod == "GET" && target.find("/header") != std::string::npos) {
            const std::string id = target.substr(17, target.size() - 17 - 7);
            answer.mBody = CollectionJSON(id, "x");
        } else if (request.mMethod == "PUT") {
            answer.mBody = "";
        } else if (request.mMethod == "POST" && target.rfind("/api/assets?", 0) == 0) {
            if (!mFailUploadOf.empty() && target.find(mFailUploadOf) != std::string::npos) {
                answer.mStatus = 500;
                answer.mBody = "disk full";
            } else {
                mUploads.push_back(Upload{target, request.Header("Content-Type"), request.mBody});
                answer.mStatus = 201;
                answer.mHeaders = {{"Location", "/api/assets/up" + std::to_string(mUploads.size())}};
            }
        } else if (request.mMethod == "GET" && target.find("/metadata") != std::string::npos) {
            answer.mBody = ItemJSON("up", "x");
        } else {
            answer.mStatus = 599;
        }
        return answer;
    }

    std::mutex mMutex;
    std::vector<Upload> mUploads;
    std::vector<std::string> mCreates;
    testsupport::LoopbackHttpServer mServer;
};

// Points TMPDIR at a directory of the test's own.
class TempDirEnvironment {
public:
    TempDirEnvironment()
    {
        const char* previous = std::getenv("TMPDIR");
        mHadPrevious = previous != nullptr;
        if (previous) mPrevious = previous;
        setenv("TMPDIR", mDir.Path().c_str(), 1);
    }
    ~TempDirEnvironment()
    {
        if (mHadPrevious)
            setenv("TMPDIR", mPrevious.c_str(), 1);
        else
            unsetenv("TMPDIR");
    }
    size_t Files() const
    {
        size_t count = 0;
        for (const auto& entry : std::filesystem::directory_iterator(mDir.Path())) {
            (void)entry;
            ++count;
        }
        return count;
    }

private:
    testsupport::TempDir mDir;
    std::string mPrevious;
    bool mHadPrevious = false;
};

bool WaitForNoFiles(const TempDirEnvironment& temp)
{
    for (int i = 0; i < 3000 && temp.Files() != 0; ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
    return temp.Files() == 0;
}

}  // namespace

TEST(Copy, ACollectionInsideItselfIsCopiedOnceRoundAndTheCopyEnds)
{
    TempDirEnvironment temp;
    TreeService service;
    service.mCycle = true;
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(service.ApiUrl(), "tok", "c")));
    Outcome outcome;
    client->CopyAsync(outcome.Success(), outcome.Error(), MakeCollection("S"), MakeCollection("D"),
                      Guid::CreateUnique(), Tarnvault::NameMap());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_TRUE(outcome.Succeeded()) << outcome.ErrorText();
    // sub only, under its own name (no name map): S and c1 again are skipped.
    ASSERT_EQ(service.Creates().size(), 1u);
    EXPECT_NE(service.Creates()[0].find(R"("name":"sub")"), std::string::npos);
    EXPECT_EQ(service.Uploads().size(), 2u);
}

TEST(Copy, OneFailedUploadLetsTheRestArriveAndReportsOnceAtTheEnd)
{
    TempDirEnvironment temp;
    TreeService service;
    service.mFailUploadOf = "name=a.txt";
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(service.ApiUrl(), "tok", "c")));
    Outcome outcome;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(client->CopyAsync(outcome.Success(), outcome.Error(), MakeCollection("S"), MakeCollection("D"), id,
                                Tarnvault::NameMap()),
              id);
    ASSERT_TRUE(outcome.Wait());
    EXPECT_FALSE(outcome.Succeeded());
    EXPECT_EQ(outcome.Id(), id);
    EXPECT_EQ(outcome.Status(), -100);
    EXPECT_EQ(outcome.ErrorText(), "disk full");
    ASSERT_EQ(service.Uploads().size(), 1u);
    EXPECT_EQ(service.Uploads()[0].mBody, "two");
    outcome.LetGo();
    ASSERT_TRUE(outcome.WaitReleased());
    EXPECT_EQ(outcome.Calls(), 1);
    EXPECT_TRUE(WaitForNoFiles(temp));
}
