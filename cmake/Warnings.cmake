# Every target of ours compiles warning-clean with these.
add_library(tolmonetsync_warnings INTERFACE)
target_compile_options(tolmonetsync_warnings INTERFACE -Wall -Wextra -Wno-unused-parameter)
