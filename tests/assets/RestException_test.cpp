// How failures are classified and how made-up failures look.

#include <gtest/gtest.h>

#include "assets/RestException.h"

using namespace tolmonetsync;

namespace {

boost::shared_ptr<tolmonet::Response> ServerAnswer(tolmonet::StatusCode status, const std::string& body)
{
    return boost::shared_ptr<tolmonet::Response>(
        new tolmonet::Response(status, tolmonet::HeaderList(), RecycledMemory::CopyOf(body.data(), body.size())));
}

// Runs ThrowResponse and hands back what it threw, by its most general class.
template <class Expected>
Expected Thrown(const boost::shared_ptr<tolmonet::Response>& response, const Guid& id = Guid())
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

TEST(ThrowResponse, EachClassifiedStatusHasItsClassAndTheServersText)
{
    EXPECT_EQ(400, Thrown<BadRequestException>(ServerAnswer(400, "bad")).mStatus);
    EXPECT_EQ(403, Thrown<ForbiddenException>(ServerAnswer(403, "no")).mStatus);
    EXPECT_EQ(404, Thrown<NotFoundException>(ServerAnswer(404, "gone")).mStatus);
    const Guid id = Guid::CreateUnique();
    const UnauthorizedException unauthorized = Thrown<UnauthorizedException>(ServerAnswer(401, "token expired"), id);
    EXPECT_STREQ("token expired", unauthorized.what());
    EXPECT_EQ(id, unauthorized.mRequestUID);
    EXPECT_THROW(ThrowResponse(Guid(), ServerAnswer(401, "x")), RestException);
}

TEST(ThrowResponse, EverythingElseIsUnknown)
{
    const struct {
        boost::shared_ptr<tolmonet::Response> mResponse;
        int mStatus;
        const char* mText;
    } rows[] = {
        {ServerAnswer(500, ""), 500, ""},
        {ServerAnswer(302, "moved"), 302, "moved"},
        {ServerAnswer(200, "{}"), 200, "{}"},
        {ServerAnswer(502, "bad \xFF gateway"), 502, "bad \xEF\xBF\xBD gateway"},  // still readable text
        {boost::shared_ptr<tolmonet::Response>(), -100, "No Response"},
        {MakeErrorResponse(u"Upload Header failed"), -100, "Upload Header failed"},
        {MakeErrorResponse(UTF16String()), -100, ""},
    };
    for (const auto& row : rows) {
        const UnknownException e = Thrown<UnknownException>(row.mResponse);
        EXPECT_EQ(row.mStatus, e.mStatus) << row.mText;
        EXPECT_STREQ(row.mText, e.what());
    }
}
