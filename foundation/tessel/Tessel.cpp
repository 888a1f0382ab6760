#include "foundation/tessel/Tessel.h"

#include "foundation/tessel/TesselHost.h"

// Callers are C code in spirit: nothing thrown inside may leave these.

extern "C" {

int TesselLoadExtension(const char* extensionId)
{
    if (extensionId == nullptr) return kTesselErrorBadArgument;
    try {
        return tessel::TesselHost::Get().Load(extensionId);
    } catch (...) {
        return kTesselErrorBadArgument;
    }
}

int TesselUnloadExtension(const char* extensionId)
{
    if (extensionId == nullptr) return kTesselErrorBadArgument;
    try {
        return tessel::TesselHost::Get().Unload(extensionId);
    } catch (...) {
        return kTesselErrorBadArgument;
    }
}

int TesselAddEventListener(const char* eventType, TesselEventListener listener, void* context)
{
    if (eventType == nullptr || listener == nullptr) return kTesselErrorBadArgument;
    try {
        return tessel::TesselHost::Get().AddListener(eventType, listener, context);
    } catch (...) {
        return kTesselErrorBadArgument;
    }
}

int TesselRemoveEventListener(const char* eventType, TesselEventListener listener, void* context)
{
    if (eventType == nullptr || listener == nullptr) return kTesselErrorBadArgument;
    try {
        return tessel::TesselHost::Get().RemoveListener(eventType, listener, context);
    } catch (...) {
        return kTesselErrorBadArgument;
    }
}

int TesselDispatchEvent(const ruvex::event::Event* event)
{
    if (event == nullptr || event->type == nullptr) return kTesselErrorBadArgument;
    try {
        return tessel::TesselHost::Get().Dispatch(tessel::OwnedEvent(*event));
    } catch (...) {
        return kTesselErrorBadArgument;
    }
}

}  // extern "C"
