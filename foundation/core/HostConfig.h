#pragma once
// Who the host is. The host (or the command line) sets these before it makes
// a service; the library reads them for keychain domains, root names and the
// default preference directory. Any thread may read at any time. A setter
// publishes a new value and never frees the old one, so a reference that a
// getter gave stays valid and unchanged even if a setter runs later; the
// getter called after that setter gives the new value.

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace config {

// The name of the host application ("" until set).
const UTF16String& GetClientName();
// Its version text, with points ("" until set).
const UTF16String& GetClientInternalVersion();
// The maker of the host ("" until set).
const UTF16String& GetCompanyName();

void SetClientName(const UTF16String& name);
void SetClientInternalVersion(const UTF16String& version);
void SetCompanyName(const UTF16String& company);

}  // namespace config
}  // namespace tolmocore
