// Copying a tree that holds itself, which the local service would refuse to
// store: the copy must not follow it round. (Whole trees and failed uploads
// are copied against the local service with the migration tests.)

#include <atomic>

#include "ClientTestSupport.h"

using namespace tvtest;

TEST(Copy, ACollectionInsideItselfIsCopiedOnceRoundAndTheCopyEnds)
{
    // S holds c1; c1 holds S and itself. Answered by route: a level's
    // requests arrive in any order.
    std::atomic<int> creates{0};
    testsupport::LoopbackHttpServer server([&](const HttpRequest& request) {
        const std::string target = Decode(request.mTarget);
        HttpAnswer answer;
        if (target.find(R"(scope=["/collections/S"])") != std::string::npos) {
            answer.mBody = "[" + CollectionJSON("c1", "sub") + "]";
        } else if (target.find(R"(scope=["/collections/c1"])") != std::string::npos) {
            answer.mBody = "[" + CollectionJSON("S", "again") + "," + CollectionJSON("c1", "self") + "]";
        } else if (request.mMethod == "POST" && target == "/api/collections") {
            ++creates;
            answer.mStatus = 201;
            answer.mHeaders = {{"Location", "/api/collections/new"}};
        } else if (target == "/api/collections/new/header") {
            answer.mBody = CollectionJSON("new", "sub");
        } else if (request.mMethod != "PUT") {
            answer.mStatus = 599;
        }
        return answer;
    });
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(server.Url("/api"), "tok", "c")));
    Outcome outcome;
    client->CopyAsync(outcome.Success(), outcome.Error(), Make("S"), Make("D"), Guid::CreateUnique(),
                      Tarnvault::NameMap());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_TRUE(outcome.Succeeded()) << outcome.ErrorText();
    EXPECT_EQ(creates.load(), 1);
}
