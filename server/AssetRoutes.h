#pragma once
// The asset service's routes under /api, as the client sends them:
//   POST   /api/search?q=JSON&metadata=true[&scope=JSON]      200, JSON array of assets
//   GET    /api/collections?name=CLIENT                       200, JSON array with the client root
//   POST   /api/collections  {"header":{"name","type"}}       201, Location, the collection
//   GET    /api/collections/ID/header                         200, the asset
//   GET    /api/assets/ID/metadata                            200, the asset
//   GET    /api/collections/ID/members                        200, JSON array of members
//   PUT    /api/collections/ID/members  ["/assets/ID", ...]   200
//   DELETE /api/collections/ID?recursive=B, /api/assets/ID?recursive=B   200
//   POST   /api/assets?name=N&collections=JSON  bytes         201, Location, ETag, the item
//   GET    /api/assets/ID  [If-None-Match]                    200 bytes, ETag, Content-Type, Last-Modified; or 304
// Every handler expects the request already authorised.

#include <vector>

#include "server/Router.h"

namespace tolmonetsync {
namespace server {

std::vector<Route> AssetRoutes();

}  // namespace server
}  // namespace tolmonetsync
