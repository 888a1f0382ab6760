#pragma once
// What the sync scenarios need of a server: the client the engine talks to,
// and a back door to look at and change the user's groups on the service's
// side, named by group and item under this host's preferences root.
// Each server implementation provides one of these; the scenarios run
// unchanged against all of them.

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "assets/SyncServer.h"

namespace synctest {

class ScenarioServer {
public:
    virtual ~ScenarioServer() = default;

    // The client the engine uses. One per test.
    virtual boost::shared_ptr<tolmonetsync::SyncServer> Client() = 0;

    // Group names under the preferences root, sorted; empty without a root.
    virtual std::vector<std::string> Groups() = 0;
    // Item name (UTF-8) to content, for one group; empty if there is none.
    virtual std::map<std::string, std::string> Items(const std::string& group) = 0;
    // Makes the group (and the preferences root) if missing, then puts an item
    // of that name with new content, a new entity tag and a later date.
    virtual void PutItem(const std::string& group, const std::string& name, const std::string& bytes) = 0;
    virtual void RemoveItem(const std::string& group, const std::string& name) = 0;
    virtual void MakeGroup(const std::string& group) = 0;
};

using ScenarioServerFactory = std::function<std::unique_ptr<ScenarioServer>()>;

}  // namespace synctest
