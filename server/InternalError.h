#pragma once
// The answer to a request that failed inside the service (storage, files):
// 500 with one generic line, because the exception's text may name files of
// the machine or quote SQLite. The detail goes to stderr for whoever runs
// the service.
//
// Threads: any.

#include <exception>
#include <string>

#include <httplib.h>

namespace tolmonetsync {
namespace server {

void AnswerInternalError(const httplib::Request& request, httplib::Response& response, const std::string& detail);

// For the HTTP server's exception handler: the same for an exception that
// left a handler.
void AnswerEscapedException(const httplib::Request& request, httplib::Response& response, std::exception_ptr failure);

}  // namespace server
}  // namespace tolmonetsync
