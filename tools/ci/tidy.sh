#!/usr/bin/env bash
# Runs clang-tidy (checks in .clang-tidy) over the tool's and the stand-in
# loader's sources, with the compile commands of a configured build folder.
# Exits non-zero on any finding: .clang-tidy turns every warning into an error.
#
#   tools/ci/tidy.sh <build-folder> [jobs]
set -euo pipefail
cd "$(dirname "$0")/../.."
build=${1:?usage: tools/ci/tidy.sh <build-folder> [jobs]}
jobs=${2:-$(nproc)}
tidy=${CLANG_TIDY:-clang-tidy}

if [ ! -f "$build/compile_commands.json" ]; then
    echo "tidy: $build/compile_commands.json is missing; configure the build first" >&2
    exit 2
fi

mapfile -t sources < <(find qsd tools -name '*.cpp' | sort)
if [ ${#sources[@]} -eq 0 ]; then
    echo "tidy: no sources under qsd/ or tools/" >&2
    exit 2
fi

log=$build/clang-tidy.log
status=0
# One clang-tidy per file, $jobs at once; the compiler's own "N warnings
# generated" chatter (from system headers, filtered out) goes to the log only.
printf '%s\0' "${sources[@]}" |
    xargs -0 -n 1 -P "$jobs" "$tidy" -p "$build" --quiet >"$log" 2>&1 || status=$?

findings=$(grep -cE '^[^ ]+:[0-9]+:[0-9]+: (warning|error):' "$log" || true)
if [ "$status" -ne 0 ] || [ "$findings" -ne 0 ]; then
    grep -vE '^[0-9]+ (warning|error)s? generated\.$' "$log" || true
    echo "tidy: $findings finding(s) in ${#sources[@]} files (clang-tidy status $status)" >&2
    exit 1
fi
echo "tidy: ${#sources[@]} files, no finding"
