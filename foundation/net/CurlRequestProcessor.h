#pragma once
// PLACEHOLDER: the libcurl processor is being written.
#include "foundation/net/RequestProcessor.h"
namespace tolmonet { namespace http {
class CurlRequestProcessor : public RequestProcessor {
public:
    static boost::shared_ptr<RequestProcessor> CreateProcessWide();
};
}}
