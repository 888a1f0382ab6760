#pragma once
// The event record that travels to and from the extension host, and the type
// of the event the host sends when an extension has gone.

namespace ruvex {
namespace event {

// Borrowed text only: a dispatched record and its text need to last for the
// call alone, and a record handed to a listener lasts for that call alone.
// Any pointer may be null.
struct Event {
    const char* type;
    int scope;
    const char* appId;
    const char* extensionId;
    const char* data;
};

// Sent by the host some time after an extension was unloaded; its data holds
// the extension's identifier between "<Id>" and "</Id>".
extern const char* const EVENT_TYPE_RUVEX_EXTENSION_UNLOADED;

}  // namespace event
}  // namespace ruvex
