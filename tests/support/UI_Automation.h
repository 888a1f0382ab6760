#pragma once
// Playing the user in tests. From any thread but the modal loop's own: wait
// for a modal dialog, then run actions inside its loop, where the dialog's and
// controls' Handle... entry points may be called and nodes read. Built on the
// UI's modal-loop observer and ModalLoops::Post. Every wait gives up after
// 30 seconds, long enough never to be met by a working run.

#include <boost/function.hpp>
#include <boost/intrusive_ptr.hpp>

#include "foundation/ui/UI_Dialog.h"
#include "foundation/ui/UI_TextEdit.h"

namespace tolmoui {

// The dialog of the innermost running modal loop whose close is not yet
// posted, waiting until there is one; null on time-out.
boost::intrusive_ptr<UI_Dialog> WaitForModalDialog();

// Runs `action` on the thread of the innermost modal loop, inside the loop,
// and waits until it has run. False if no loop started it in time or the
// loop ended first; `action` then never runs. Once started, it is waited for
// to the end. Not for the loop's own thread. `action` must not throw.
bool RunInModalLoop(const boost::function<void()>& action);

// Waits until at least `depth` modal loops run (a nested dialog has come up).
bool WaitForModalLoopDepth(int depth);

// The user replaces the field's text with `newValue`, inside the loop. False
// (and nothing changes) if the field is disabled.
bool SimulateTyping(UI_TextEdit& edit, const UTF16String& newValue);

}  // namespace tolmoui
