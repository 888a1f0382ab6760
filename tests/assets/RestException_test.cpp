// How failures are classified and how made-up failures look.

#include <gtest/gtest.h>

#include "assets/RestException.h"

using namespace tolmonetsync;

namespace {

boost::shared_ptr<tolmonet::Response> ServerAnswer(tolmonet::StatusCode status, const std::string& body)
{
    return boost::shared_ptr<tolmonet::Response>(new tolmonet::Response(
        status, tolmonet::HeaderList(), RecycledMemory::CopyOf(body.data(), body.size())));
}

// Runs ThrowResponse and hands back what it threw, by its most general class.
template <class Expected>
Expected Thrown(const Guid& id, const boost::shared_ptr<tolmonet::Response>& response)
{
    try {
        ThrowResponse(id, response);
    } catch (const Expected& e) {
        return e;
    } catch (const std::exception& e) {
        ADD_FAILURE() << "threw another class: " << e.what();
    }
    throw std::logic_error("ThrowResponse returned");
}

}  // namespace

TEST(ThrowResponse, EachClassifiedStatusHasItsClass)
{
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(Thrown<BadRequestException>(id, ServerAnswer(400, "bad")).mStatus, 400);
    EXPECT_EQ(Thrown<ForbiddenException>(id, ServerAnswer(403, "no")).mStatus, 403);
    EXPECT_EQ(Thrown<NotFoundException>(id, ServerAnswer(404, "gone")).mStatus, 404);
    const UnauthorizedException unauthorized = Thrown<UnauthorizedException>(id, ServerAnswer(401, "token expired"));
    EXPECT_STREQ(unauthorized.what(), "token expired");
    EXPECT_EQ(unauthorized.mRequestUID, id);
}

TEST(ThrowResponse, UnauthorizedIsCatchableAsEveryBase)
{
    EXPECT_THROW(ThrowResponse(Guid(), ServerAnswer(401, "x")), RestException);
    EXPECT_THROW(ThrowResponse(Guid(), ServerAnswer(401, "x")), std::exception);
}

TEST(ThrowResponse, EverythingElseIsUnknownWithTheServersBody)
{
    const UnknownException empty500 = Thrown<UnknownException>(Guid(), ServerAnswer(500, ""));
    EXPECT_STREQ(empty500.what(), "");
    EXPECT_EQ(empty500.mStatus, 500);
    EXPECT_EQ(Thrown<UnknownException>(Guid(), ServerAnswer(302, "moved")).mStatus, 302);
    EXPECT_EQ(Thrown<UnknownException>(Guid(), ServerAnswer(200, "{}")).mStatus, 200);
    // A body that is not UTF-8 still gives a readable message.
    EXPECT_STREQ(Thrown<UnknownException>(Guid(), ServerAnswer(502, "bad \xFF gateway")).what(),
                 "bad \xEF\xBF\xBD gateway");
}

TEST(ThrowResponse, NullResponseIsNoResponse)
{
    const UnknownException e = Thrown<UnknownException>(Guid(), boost::shared_ptr<tolmonet::Response>());
    EXPECT_STREQ(e.what(), "No Response");
    EXPECT_EQ(e.mStatus, -100);
}

TEST(MakeErrorResponse, CarriesTheTextAsBodyWithStatusMinus100)
{
    const auto response = MakeErrorResponse(u"Upload Header failed");
    EXPECT_EQ(response->status, -100);
    EXPECT_TRUE(response->headers.empty());
    EXPECT_EQ(response->reserved, 0);
    const UnknownException e = Thrown<UnknownException>(Guid(), response);
    EXPECT_EQ(e.mStatus, -100);
    EXPECT_STREQ(e.what(), "Upload Header failed");
}

TEST(MakeErrorResponse, EmptyTextGivesNoBody)
{
    const auto response = MakeErrorResponse(UTF16String());
    EXPECT_EQ(response->status, -100);
    EXPECT_FALSE(response->body);
    EXPECT_STREQ(Thrown<UnknownException>(Guid(), response).what(), "");
}
