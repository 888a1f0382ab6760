#pragma once
// A private desktop session for the system keychain: a session bus of its
// own and a keyring daemon on it serving the Secret Service with its default
// collection unlocked, HOME and XDG_RUNTIME_DIR in a temporary directory.
// The daemons leave when the object goes.

#include <string>

#include "support/TempDir.h"

namespace testsupport {

class SecretServiceSession {
public:
    SecretServiceSession();  // starts the daemons; see Ready()
    ~SecretServiceSession();
    SecretServiceSession(const SecretServiceSession&) = delete;
    SecretServiceSession& operator=(const SecretServiceSession&) = delete;

    // False, with the reason, if the daemons could not be started.
    bool Ready(std::string& whyNot) const;
    // "DBUS_SESSION_BUS_ADDRESS=..." for a command to use this session.
    std::string BusVariable() const { return "DBUS_SESSION_BUS_ADDRESS=" + mAddress; }
    // Locks the default collection, as a screen lock does; true if it did.
    bool LockDefaultCollection() const;
    const std::filesystem::path& Home() const { return mHome.Path(); }

private:
    TempDir mHome;
    pid_t mBus = -1;
    std::string mAddress;
    std::string mWhyNot;
};

// The session this process uses, started on first call (the secret library
// keeps its bus connection for the life of the process) and stopped at
// exit. Starting it points this process's DBUS_SESSION_BUS_ADDRESS at it, so
// commands started afterwards use it too, and adds the leak suppressions for
// the libraries the command then loads to LSAN_OPTIONS.
bool StartSecretServiceSession(std::string& whyNot);

}  // namespace testsupport
