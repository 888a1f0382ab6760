#pragma once
// The user name and password dialog a host shows to sign a user in. The
// library exports it and never calls it itself.

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/core/Strings.h"
#include "foundation/ui/SupplierInterface.h"
#include "foundation/ui/UI_MessageBox.h"
#include "foundation/ui/UI_Node.h"

namespace tolmonetsync {

// Decides whether the typed user name and password may sign in. On refusal
// it may put a text for the user into `error`, which the dialog shows in its
// message area. Runs on the UI thread: while it blocks, so does the dialog.
using SyncAuthenticationValidator =
    boost::function<bool(const UTF16String& userName, const UTF16String& password, UTF16String& error)>;

// Runs a modal message box with a user name field, a password field and, for
// each non-empty link text, a link beside its field that opens its URL in the
// browser. `userName` and `password` are the starting values and, however the
// dialog ends (also on Cancel), receive what the fields hold at the end.
// OK is enabled only while both fields hold text, and closes the dialog only
// if `validator` accepts; without a validator only Cancel ends it. `width`,
// `height` and `messageCallback` go to the message box unchanged. On the UI
// thread; blocks until the dialog closes. True if it closed with OK.
bool SyncAuthenticationDialog(const tolmoui::SupplierInterface* supplier, const UTF16String& title,
                              const UTF16String& message, const UTF16String& userNameLabel, UTF16String& userName,
                              const UTF16String& passwordLabel, UTF16String& password,
                              const boost::shared_ptr<SyncAuthenticationValidator>& validator, tolmoui::UI_Node* parent,
                              float width, float height,
                              const boost::shared_ptr<tolmoui::UI_MessageBox::MessageCallback>& messageCallback,
                              const UTF16String& userNameLinkText, const UTF16String& userNameLinkURL,
                              const UTF16String& passwordLinkText, const UTF16String& passwordLinkURL);

}  // namespace tolmonetsync
