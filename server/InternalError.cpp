#include "server/InternalError.h"

#include <iostream>

#include "server/Exchange.h"

namespace tolmonetsync {
namespace server {

void AnswerInternalError(const httplib::Request& request, httplib::Response& response, const std::string& detail)
{
    // One string, one write: lines of parallel requests do not interleave.
    std::cerr << OneLine("local service: internal error on " + request.method + " " + request.path + ": " +
                         detail) +
                     "\n"
              << std::flush;
    response.status = 500;
    response.set_content("internal error; the service's log says more", "text/plain; charset=utf-8");
}

void AnswerEscapedException(const httplib::Request& request, httplib::Response& response, std::exception_ptr failure)
{
    try {
        std::rethrow_exception(failure);
    } catch (const std::exception& caught) {
        AnswerInternalError(request, response, caught.what());
    } catch (...) {
        AnswerInternalError(request, response, "an exception of unknown type");
    }
}

}  // namespace server
}  // namespace tolmonetsync
