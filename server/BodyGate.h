#pragma once
// What the service reads of a request body, and when. Who sends a request is
// settled from its headers before a byte of its body is read. A request
// refused then, or one whose body is over its limit, has at most
// kDiscardLimit bytes of body read and dropped; its answer carries
// "Connection: close" and the connection ends gracefully (GracefulServer),
// so the client still reads it. An upload (POST /api/assets) streams into a
// content file up to the upload limit; any other body is read whole up to
// kMaxOtherBody. Over a limit the answer is 413.
//
// Threads: the handlers run on the server's workers, any number at once.

#include <cstdint>
#include <functional>
#include <string>

#include <httplib.h>

#include "server/ContentFiles.h"

namespace tolmonetsync {
namespace server {

const std::uint64_t kDiscardLimit = std::uint64_t(1) << 20;
const std::uint64_t kMaxOtherBody = std::uint64_t(4) << 20;

// Whether a request may go on, decided from its headers alone.
struct Admission {
    int mStatus = 0;  // 0: admitted; else the refusal's status
    std::string mText;
    std::int64_t mUser = 0;  // the signed-in user, 0 where none is needed
};

class BodyGate {
public:
    using Admit = std::function<Admission(const httplib::Request&)>;
    // Runs with the body read: in request.body, or in upload for an upload.
    using Answer = std::function<void(const httplib::Request&, httplib::Response&, const Admission&,
                                      ContentFiles::Incoming* upload)>;

    BodyGate(ContentFiles& content, std::uint64_t maxUpload, Admit admit, Answer answer);
    // Handles every method and path on the server, and its "Expect: 100-continue".
    void Install(httplib::Server& server);

private:
    void WithoutBody(const httplib::Request& request, httplib::Response& response) const;
    void WithBody(const httplib::Request& request, httplib::Response& response,
                  const httplib::ContentReader& reader) const;
    int Expect(const httplib::Request& request, httplib::Response& response) const;
    std::uint64_t LimitFor(const httplib::Request& request) const;

    ContentFiles& mContent;
    std::uint64_t mMaxUpload;
    Admit mAdmit;
    Answer mAnswer;
};

}  // namespace server
}  // namespace tolmonetsync
