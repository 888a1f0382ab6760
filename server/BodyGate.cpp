#include "server/BodyGate.h"

#include <exception>
#include <memory>

#include "server/Exchange.h"
#include "server/GracefulServer.h"
#include "server/InternalError.h"

namespace tolmonetsync {
namespace server {

namespace {

enum BodyOutcome { BodyOutcome_Complete, BodyOutcome_TooLarge, BodyOutcome_Broken };

bool IsUpload(const httplib::Request& request)
{
    return request.method == "POST" && request.path == "/api/assets";
}

bool AnnouncesBody(const httplib::Request& request)
{
    return request.has_header("Transfer-Encoding") ||
           (request.has_header("Content-Length") && request.get_header_value("Content-Length") != "0");
}

// Over the limit also when the length cannot be read: the reader would refuse it anyway.
bool AnnouncesMoreThan(const httplib::Request& request, std::uint64_t limit)
{
    if (!request.has_header("Content-Length")) return false;
    const std::string text = request.get_header_value("Content-Length");
    if (text.empty() || text.size() > 19 || text.find_first_not_of("0123456789") != std::string::npos) return true;
    return std::stoull(text) > limit;
}

void RefuseAndClose(httplib::Response& response, int status, const std::string& line)
{
    response.status = status;
    response.set_content(OneLine(line), "text/plain; charset=utf-8");
    CloseAfterAnswer(response);
}

std::string TooLarge(std::uint64_t limit)
{
    return "the body is larger than " + std::to_string(limit) + " bytes";
}

void DiscardBody(const httplib::ContentReader& reader)
{
    std::uint64_t seen = 0;
    reader([&seen](const char*, size_t size) {
        seen += size;
        return seen < kDiscardLimit;
    });
}

// Hands the body to sink piece by piece, at most limit bytes of it.
BodyOutcome ReadBody(const httplib::ContentReader& reader, std::uint64_t limit,
                     const std::function<void(const char*, size_t)>& sink)
{
    std::uint64_t seen = 0;
    bool tooLarge = false;
    std::exception_ptr failure;
    const bool whole = reader([&](const char* data, size_t size) {
        seen += size;
        if (seen > limit) {
            tooLarge = true;
            return false;
        }
        try {
            sink(data, size);
        } catch (...) {
            failure = std::current_exception();
            return false;
        }
        return true;
    });
    if (failure) std::rethrow_exception(failure);
    if (tooLarge) return BodyOutcome_TooLarge;
    return whole ? BodyOutcome_Complete : BodyOutcome_Broken;
}

}  // namespace

BodyGate::BodyGate(ContentFiles& content, std::uint64_t maxUpload, Admit admit, Answer answer)
    : mContent(content), mMaxUpload(maxUpload), mAdmit(std::move(admit)), mAnswer(std::move(answer))
{
}

void BodyGate::Install(httplib::Server& server)
{
    const auto withoutBody = [this](const httplib::Request& request, httplib::Response& response) {
        WithoutBody(request, response);
    };
    // The library calls these before it reads a body, and never reads one itself.
    const auto withBody = [this](const httplib::Request& request, httplib::Response& response,
                                 const httplib::ContentReader& reader) { WithBody(request, response, reader); };
    server.Get(".*", withoutBody);
    // Whether a request without a body reaches the content readers is the library's choice.
    server.Post(".*", withoutBody);
    server.Put(".*", withoutBody);
    server.Delete(".*", withoutBody);
    server.Patch(".*", withoutBody);
    server.Post(".*", withBody);
    server.Put(".*", withBody);
    server.Delete(".*", withBody);
    server.Patch(".*", withBody);
    server.set_expect_100_continue_handler(
        [this](const httplib::Request& request, httplib::Response& response) { return Expect(request, response); });
}

std::uint64_t BodyGate::LimitFor(const httplib::Request& request) const
{
    return IsUpload(request) ? mMaxUpload : kMaxOtherBody;
}

void BodyGate::WithoutBody(const httplib::Request& request, httplib::Response& response) const
{
    // The library reads no body of these methods: what follows would pass for the next request.
    if (AnnouncesBody(request)) {
        RefuseAndClose(response, 400, request.method + " takes no body");
        return;
    }
    try {
        const Admission admission = mAdmit(request);
        if (admission.mStatus != 0) {
            response.status = admission.mStatus;
            response.set_content(OneLine(admission.mText), "text/plain; charset=utf-8");
            return;
        }
        mAnswer(request, response, admission, nullptr);
    } catch (const std::exception& failure) {
        AnswerInternalError(request, response, failure.what());
    }
}

void BodyGate::WithBody(const httplib::Request& request, httplib::Response& response,
                        const httplib::ContentReader& reader) const
{
    StartReadingBody();
    try {
        const Admission admission = mAdmit(request);
        const std::uint64_t limit = LimitFor(request);
        if (admission.mStatus != 0 || AnnouncesMoreThan(request, limit)) {
            DiscardBody(reader);
            if (admission.mStatus != 0) {
                RefuseAndClose(response, admission.mStatus, admission.mText);
            } else {
                RefuseAndClose(response, 413, TooLarge(limit));
            }
            return;
        }
        std::unique_ptr<ContentFiles::Incoming> upload;
        BodyOutcome outcome = BodyOutcome_Complete;
        if (IsUpload(request)) {
            upload = std::make_unique<ContentFiles::Incoming>(mContent);
            outcome = ReadBody(reader, limit, [&upload](const char* data, size_t size) { upload->Append(data, size); });
        } else {
            // The library owns the request and hands it over as const; its body
            // is left for a content-reader handler to fill, as it would itself.
            std::string& body = const_cast<httplib::Request&>(request).body;
            outcome = ReadBody(reader, limit, [&body](const char* data, size_t size) { body.append(data, size); });
        }
        if (outcome == BodyOutcome_TooLarge) {
            RefuseAndClose(response, 413, TooLarge(limit));
        } else if (outcome == BodyOutcome_Broken) {
            RefuseAndClose(response, 400, "the body did not arrive whole");
        } else {
            mAnswer(request, response, admission, upload.get());
        }
    } catch (const std::exception& failure) {
        // The body may be partly unread.
        AnswerInternalError(request, response, failure.what());
        CloseAfterAnswer(response);
    }
}

int BodyGate::Expect(const httplib::Request& request, httplib::Response& response) const
{
    // Refused before the client sends the body at all.
    try {
        const Admission admission = mAdmit(request);
        if (admission.mStatus != 0) {
            RefuseAndClose(response, admission.mStatus, admission.mText);
        } else if (AnnouncesMoreThan(request, LimitFor(request))) {
            RefuseAndClose(response, 413, TooLarge(LimitFor(request)));
        } else {
            return 100;
        }
    } catch (const std::exception& failure) {
        AnswerInternalError(request, response, failure.what());
        CloseAfterAnswer(response);
    }
    return response.status;
}

}  // namespace server
}  // namespace tolmonetsync
