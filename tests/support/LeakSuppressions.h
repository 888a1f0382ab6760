#pragma once
// What LeakSanitizer is told to overlook in our test processes and in the
// command they start: the Secret Service client and the glib beneath it
// keep type tables, bus connections and caches for the whole process.

namespace testsupport {

inline constexpr char kLeakSuppressions[] =
    "leak:libglib-2.0.so\n"
    "leak:libgobject-2.0.so\n"
    "leak:libgio-2.0.so\n"
    "leak:libsecret-1.so\n";

}  // namespace testsupport
