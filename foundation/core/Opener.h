#pragma once
// Handing paths and URLs to the desktop. The opener is replaceable so that
// tests record what would have been opened instead of starting a browser.

#include <boost/function.hpp>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace utility {

// Gives a path or URL to the desktop's default handler (xdg-open, started
// detached, without waiting for it). True if the handler could be started.
bool OpenFileInDefaultApplication(const UTF16String& pathOrURL);

// False for empty text; puts "http://" in front of text without "://", then
// hands it to OpenFileInDefaultApplication.
bool OpenURLInDefaultBrowser(const UTF16String& url);

// Replaces what OpenFileInDefaultApplication does; an empty function brings
// back the default. Returns the previous opener (empty for the default).
using Opener = boost::function<bool(const UTF16String& pathOrURL)>;
Opener SetOpener(const Opener& opener);

}  // namespace utility
}  // namespace tolmocore
