#include "server/Router.h"

namespace tolmonetsync {
namespace server {

Router::Router(const std::vector<Route>& routes)
{
    for (const Route& route : routes) mRoutes.push_back({route.mMethod, std::regex(route.mPattern), route.mHandler});
}

void Router::Dispatch(Exchange& exchange) const
{
    const std::string& path = exchange.mRequest.path;
    bool pathKnown = false;
    for (const Compiled& route : mRoutes) {
        std::smatch match;
        if (!std::regex_match(path, match, route.mPattern)) continue;
        pathKnown = true;
        if (route.mMethod != exchange.mRequest.method) continue;
        exchange.mParams.clear();
        for (std::size_t i = 1; i < match.size(); ++i) exchange.mParams.push_back(match[i].str());
        route.mHandler(exchange);
        return;
    }
    if (pathKnown) {
        exchange.Text(405, exchange.mRequest.method + " is not allowed on " + path);
    } else {
        exchange.Text(404, "no such resource " + path);
    }
}

}  // namespace server
}  // namespace tolmonetsync
