#!/usr/bin/env bash
# Installs the build into a temporary prefix, then builds and runs a separate
# project against it twice: through the CMake package and through pkg-config.
#   check.sh BUILD_DIR SOURCE_DIR CXX_FLAGS
set -euo pipefail
build=$1
source=$2
flags=${3:-}
prefix=$(mktemp -d)
trap 'rm -rf "$prefix"' EXIT

cmake --install "$build" --prefix "$prefix" >/dev/null

# Nothing test-only ships: no header of the test kit and no symbol of the
# scripted extensions, the UI automation or counters kept for tests.
test_only_headers=$(find "$prefix/include" \( -name '*Scripted*' -o -name '*Automation*' -o -name '*Fake*' \
  -o -name '*Recorder*' -o -name '*InMemory*' -o -path '*/support/*' -o -path '*/tests/*' \) -print)
[ -z "$test_only_headers" ] || { echo "test-only headers installed:"; echo "$test_only_headers"; exit 1; }
library=$(find "$prefix/lib" -name 'libtolmonetsync.so*' -type f | head -n 1)
[ -n "$library" ] || { echo "no installed library"; exit 1; }
test_only_names='ScriptedExtension|ExtensionScript|Simulate[A-Z]|WaitForModalDialog|RunInModalLoop|WaitForModalLoopDepth|GetDrawCount|GetSetLocalRectCount|GetSizeChangedCount|FlushHost|SendHostEvent|TesselHost::Flush|FileOpsRecorder|InMemoryServer|InMemoryTree'
found=$(nm -DC "$library" | grep -E "$test_only_names" || true)
[ -z "$found" ] || { echo "test-only names in the installed library:"; echo "$found" | head -n 20; exit 1; }
echo "nothing test-only installed"
# Bash completion ships with the command and completes commands and --mode values.
completion="$prefix/share/bash-completion/completions/tolmonetsync"
[ -f "$completion" ] || { echo "no bash completion installed at $completion"; exit 1; }
complete_words() {
  bash -c 'source "$1"; shift; COMP_WORDS=("$@"); COMP_CWORD=$(($# - 1)); _tolmonetsync; echo "${COMPREPLY[*]}"' \
    _ "$completion" "$@"
}
[ "$(complete_words tolmonetsync do)" = "doctor" ] || { echo "completion of 'do': $(complete_words tolmonetsync do)"; exit 1; }
out=$(complete_words tolmonetsync --json sync --mode "")
[ "$out" = "two-way server-wins local-wins" ] || { echo "completion of --mode: $out"; exit 1; }
echo "bash completion installed and completing"
cmake -S "$source/tests/install/consumer" -B "$prefix/consumer-build" -G Ninja \
  -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_FLAGS="$flags" >/dev/null
cmake --build "$prefix/consumer-build" >/dev/null
out=$(LD_LIBRARY_PATH="$prefix/lib" "$prefix/consumer-build/consumer")
[ "$out" = "installed package works same-id" ] || { echo "cmake consumer printed: $out"; exit 1; }

export PKG_CONFIG_PATH="$prefix/lib/pkgconfig"
# shellcheck disable=SC2046
c++ -std=c++17 $flags "$source/tests/install/consumer/main.cpp" -o "$prefix/consumer-pc" $(pkg-config --cflags --libs tolmonetsync)
out=$(LD_LIBRARY_PATH="$prefix/lib" "$prefix/consumer-pc")
[ "$out" = "installed package works same-id" ] || { echo "pkg-config consumer printed: $out"; exit 1; }
echo "installed package usable through CMake and pkg-config"

# The host example, built against the installed package, syncs a folder with
# the installed service and a second folder gets the file back.
cmake -S "$source/examples/host" -B "$prefix/example-build" -G Ninja \
  -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_FLAGS="$flags" >/dev/null
cmake --build "$prefix/example-build" >/dev/null
export LD_LIBRARY_PATH="$prefix/lib"
mkdir -p "$prefix/data" "$prefix/first" "$prefix/second" "$prefix/pref1" "$prefix/pref2"
"$prefix/bin/tolmonetsync" serve --data "$prefix/data" --listen 127.0.0.1:0 --token host:example-token \
  >"$prefix/serve.out" &
serve_pid=$!
trap 'kill $serve_pid 2>/dev/null; wait $serve_pid 2>/dev/null; rm -rf "$prefix"' EXIT
for _ in $(seq 100); do grep -q '^listening on ' "$prefix/serve.out" && break; sleep 0.1; done
base=$(sed -n 's/^listening on //p' "$prefix/serve.out")
[ -n "$base" ] || { echo "serve did not start"; exit 1; }
echo '{"zoom": 2}' >"$prefix/first/view.json"
out=$("$prefix/example-build/host_example" "$base/api" example-token "$prefix/first" "$prefix/pref1")
[ "$out" = "synced: 1 file(s) moved (1 up, 0 down)" ] || { echo "example printed: $out"; exit 1; }
out=$("$prefix/example-build/host_example" "$base/api" example-token "$prefix/second" "$prefix/pref2")
[ "$out" = "synced: 1 file(s) moved (0 up, 1 down)" ] || { echo "example printed: $out"; exit 1; }
cmp "$prefix/first/view.json" "$prefix/second/view.json"
echo "host example synced a folder through the installed service"
