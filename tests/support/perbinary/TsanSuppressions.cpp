// The HTTP server library, and the GLib stack the system keychain loads,
// come compiled without ThreadSanitizer. Its own
// synchronisation (function-local statics among it) is invisible to the
// tool, which then reports the library's memcpy and memcmp on data that it
// did hand over correctly. Our code stays checked: only what the library's own
// calls into the C library touch is left out.

#if defined(__SANITIZE_THREAD__)
extern "C" const char* __tsan_default_suppressions()
{
    // Not "race:": every handler of ours runs below the library's frames.
    // GLib's slice allocator and bus thread hand memory over through their own
    // locks in the same way.
    return "called_from_lib:libcpp-httplib.so\n"
           "called_from_lib:libglib-2.0.so.0\n"
           "called_from_lib:libgobject-2.0.so.0\n"
           "called_from_lib:libgio-2.0.so.0\n"
           "called_from_lib:libsecret-1.so.0\n";
}
#endif
