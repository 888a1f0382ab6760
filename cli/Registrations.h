#pragma once
// The registrations a person writes on the command line:
//   --dir  path=DIR,group=NAME,ext=.EXT[,max-size=BYTES][,checksum]
//   --file path=FILE,group=NAME[,name=NAME][,type=MIME][,max-size=BYTES][,checksum]
// Keys may come in any order, each at most once. Relative paths are taken
// from the working directory. A directory that does not exist is refused; a
// file that does not exist is not (a sync brings it back from the server),
// but its directory must exist.

#include <string>

#include "sync/SyncRecords.h"

namespace tolmonetsync {
namespace cli {

// Both throw UsageError naming the option, the key and what is wrong.
// `mustExist` false takes a missing directory as given, for a command that
// reports it rather than refusing.
SyncDir ParseDirRegistration(const std::string& spec, bool mustExist = true);
SyncFile ParseFileRegistration(const std::string& spec, bool mustExist = true);

}  // namespace cli
}  // namespace tolmonetsync
