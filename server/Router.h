#pragma once
// The service's own routing: a table of method, path pattern and handler.
// A path that no route knows is 404; a known path with another method 405.

#include <functional>
#include <regex>
#include <string>
#include <vector>

#include "server/Exchange.h"

namespace tolmonetsync {
namespace server {

using RouteHandler = std::function<void(Exchange&)>;

struct Route {
    const char* mMethod;
    const char* mPattern;  // ECMAScript, over the whole path; groups become Exchange::mParams
    RouteHandler mHandler;
};

class Router {
public:
    explicit Router(const std::vector<Route>& routes);
    // Fills mParams and runs the handler, or answers 404 or 405.
    void Dispatch(Exchange& exchange) const;

private:
    struct Compiled {
        std::string mMethod;
        std::regex mPattern;
        RouteHandler mHandler;
    };
    std::vector<Compiled> mRoutes;
};

}  // namespace server
}  // namespace tolmonetsync
