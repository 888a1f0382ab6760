# Sanitizer builds live in build directories of their own (see ./dev).
if(TOLMONETSYNC_SANITIZE)
  set(_san "-fsanitize=${TOLMONETSYNC_SANITIZE}" -fno-omit-frame-pointer)
  if(TOLMONETSYNC_SANITIZE MATCHES "undefined")
    # A report must fail the run, not scroll past.
    list(APPEND _san -fno-sanitize-recover=all)
  endif()
  add_compile_options(${_san})
  add_link_options(${_san})
endif()
