#pragma once
// The extension host's C interface, served in process by a host of our own.
//
// The host works on a thread of its own, started on first use. Every listener
// call and every event an extension sends happens on that thread; the five
// functions may be called from any thread, also from inside a listener.
// Loading, unloading and dispatching only queue work for the host's thread
// and return at once. Each returns kTesselOK, or an error code when the call
// was refused (nothing happens then).

#include "foundation/tessel/RuvexEvent.h"

// A listener gets the event and the context given when it was added.
typedef void (*TesselEventListener)(const ruvex::event::Event* event, void* context);

extern "C" {

enum {
    kTesselOK = 0,
    kTesselErrorBadArgument = 1,       // a null identifier, type, listener or event
    kTesselErrorUnknownExtension = 2,  // no extension is known under the identifier
    kTesselErrorNotLoaded = 3,         // unloading an extension that is not loaded
    kTesselErrorNotFound = 4,          // removing a listener that was never added
};

// Starts the extension; it may send events from then on.
int TesselLoadExtension(const char* extensionId);
// Ends the extension. The host sends EVENT_TYPE_RUVEX_EXTENSION_UNLOADED
// later, naming it.
int TesselUnloadExtension(const char* extensionId);
// Calls `listener` with `context` for every event of `eventType`, from any
// extension or the host itself. Adding the same triple twice calls it twice.
int TesselAddEventListener(const char* eventType, TesselEventListener listener, void* context);
// Removes one addition of the same triple. A call already under way on the
// host's thread may still finish after this returns.
int TesselRemoveEventListener(const char* eventType, TesselEventListener listener, void* context);
// Delivers a copy of the event to the loaded extension it names, or to every
// loaded extension if it names none, and to the listeners of its type.
int TesselDispatchEvent(const ruvex::event::Event* event);

}  // extern "C"
