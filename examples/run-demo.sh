#!/usr/bin/env bash
# Installs the sample product into a copy of the sample server installation,
# the way an administrator would: one zr7inst command without -o, which
# starts the installing run with its output appended to logs/qsdinst.log.
# Then shows what happened. Every run starts from a fresh copy, so the demo
# can be run any number of times.
#
#   examples/run-demo.sh [build-folder]     (default: build/release)
set -euo pipefail

examples=$(cd "$(dirname "$0")" && pwd)
build=$(cd "${1:-$examples/../build/release}" && pwd)
scratch=$build/demo
home=$scratch/home
image=$scratch/image
server=HUB01
tables=$home/tables/$server

for program in zr7inst qdsload; do
    if [ ! -x "$build/bin/$program" ]; then
        echo "run-demo: $build/bin/$program is missing; build first (make demo does)" >&2
        exit 1
    fi
done

heading() {
    printf '\n===== %s\n' "$*"
}

# A fresh copy of the sample; the .keep files only keep empty folders in git.
rm -rf "$scratch"
mkdir -p "$scratch"
cp -R "$examples/sample/." "$scratch/"
find "$scratch" -name .keep -type f -delete
(cd "$home" && find . -type f | sort) >"$scratch/files-before"

# The stand-in loader comes first on PATH, as the server's own would.
export PATH="$build/bin:$PATH"
unset MARLIN_HOME MARLINHOME VXA_TRC1

heading "zr7inst -h $home -c KZR_HISTORY_HOURS=24 -m kzr $image"
set +e
zr7inst -h "$home" -c KZR_HISTORY_HOURS=24 -m kzr "$image"
status=$?
set -e

heading "exit status: $status"

log=$home/logs/qsdinst.log
heading "log $log"
echo "($(wc -l <"$log") lines; shown without entry and exit events and per-file copy details)"
grep -v -E '\) (Entry|Exit(: -?[0-9]+)?)$|zr7\.InstallUtil::copy_file:' "$log" || true

heading "VXAENV: what changed (diff of the backup against the new file)"
backup=
if [ -d "$tables/.archive" ]; then
    backup=$(find "$tables/.archive" -name 'VXAENV_*' -type f | sort | tail -n 1)
fi
if [ -n "$backup" ]; then
    echo "backup: $backup"
    diff -u "$backup" "$tables/VXAENV" || true
else
    echo "no backup under $tables/.archive: VXAENV was not rewritten"
fi

heading "files installed"
(cd "$home" && find . -type f | sort) >"$scratch/files-after"
comm -13 "$scratch/files-before" "$scratch/files-after" |
    grep -v -E '^\./logs/|/\.archive/|/qdsload\.catalog$' || true
echo
echo "kept as they were (TABLE_PRESERVE does not replace):"
echo "  tables/$server/kzr_site.cfg: $(tail -n 1 "$tables/kzr_site.cfg")"
echo "installed files that still hold carriage returns (trees copied without T):"
(cd "$home" && grep -rl $'\r' --exclude-dir=logs --exclude-dir=.archive . | sort | sed 's/^/  /') || true

heading "what the loader recorded"
catalog=$home/tables/cicatrsq/qdsload.catalog
echo "--- tables/cicatrsq/qdsload.catalog (the stand-in loader's catalog)"
if [ -f "$catalog" ]; then cat "$catalog"; else echo "nothing loaded"; fi
for log in "$home"/logs/*.sql.log; do
    [ -e "$log" ] || { echo "no seeding log"; break; }
    echo "--- ${log#"$home"/} (the loader's output)"
    cat "$log"
done

heading "done: zr7inst ended with status $status"
exit "$status"
