#pragma once
// One request and its answer as a route handler sees them, with the ways a
// handler answers: JSON, a one-line text, bytes, headers in the chosen case.

#include <cstdint>
#include <string>
#include <vector>

#include <httplib.h>

#include "server/AnswerStyle.h"
#include "server/ContentFiles.h"

namespace tolmonetsync {
namespace server {

class AssetStore;

struct Exchange {
    const httplib::Request& mRequest;
    httplib::Response& mResponse;
    std::vector<std::string> mParams;  // the route pattern's groups, in order
    std::int64_t mUser = 0;            // the signed-in user
    AnswerStyle mStyle;                // as it was when the request arrived
    AssetStore& mAssets;
    int mPort = 0;  // the service's own port, for absolute URLs
    // An upload's body, received into a content file; null for other requests.
    ContentFiles::Incoming* mUpload = nullptr;

    // The query value, or empty; present tells whether the key was there.
    std::string Query(const char* key, bool* present = nullptr) const;
    void Header(const std::string& usualName, const std::string& value);
    void Json(int status, const std::string& text);
    void Text(int status, const std::string& line);
    // "/api/collections/ID" or "/api/assets/ID", absolute if the style says so.
    std::string Location(bool collection, const std::string& id) const;
};

// One line for people: no line breaks.
std::string OneLine(const std::string& text);

}  // namespace server
}  // namespace tolmonetsync
