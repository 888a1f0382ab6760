#pragma once
// What the in-process extension host needs of an extension, and the copy of
// an event record that lives as long as the host needs it.

#include <string>

#include <boost/optional.hpp>

#include "foundation/tessel/RuvexEvent.h"

namespace tessel {

// An event record that owns its text; null pointers stay null.
class OwnedEvent {
public:
    OwnedEvent() = default;
    explicit OwnedEvent(const ruvex::event::Event& event);
    OwnedEvent(const std::string& type, int scope, const boost::optional<std::string>& appId,
               const boost::optional<std::string>& extensionId, const boost::optional<std::string>& data);

    // Valid while this object lives and is not changed.
    ruvex::event::Event View() const;

    const std::string& Type() const { return mType; }
    int Scope() const { return mScope; }
    const boost::optional<std::string>& AppId() const { return mAppId; }
    const boost::optional<std::string>& ExtensionId() const { return mExtensionId; }
    const boost::optional<std::string>& Data() const { return mData; }

private:
    std::string mType;
    int mScope = 0;
    boost::optional<std::string> mAppId;
    boost::optional<std::string> mExtensionId;
    boost::optional<std::string> mData;
};

// An extension as the host runs it. Every member is called on the host's
// thread only, one at a time.
class TesselExtension {
public:
    virtual ~TesselExtension() = default;
    virtual const std::string& Id() const = 0;
    virtual void OnLoad() = 0;
    // The extension ends; once it has, at once or later, it calls
    // TesselHost::Ended, and the host tells the listeners.
    virtual void OnUnload() = 0;
    virtual void OnEvent(const OwnedEvent& event) = 0;
};

}  // namespace tessel
