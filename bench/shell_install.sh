#!/usr/bin/env bash
# The shell way, the benchmark's baseline: the same installation as the
# tool's command list, run the way a command line through the system shell
# runs it: one `sh -c` per file copied (`cp -f`, or `tr -d '\r'` where
# carriage returns go) and one per SQL file seeded.
#
#   shell_install.sh IMAGE HOME SERVER ARCH KEY=VALUE MODULE
#
# The walk, the existence tests and the environment-file rewrite stay in this
# shell, as the tool does them in its own process.
set -u

if [ $# -ne 6 ]; then
    echo "usage: shell_install.sh IMAGE HOME SERVER ARCH KEY=VALUE MODULE" >&2
    exit 2
fi
msrv="${1%/}/MSRV"
home="${2%/}"
server="$3"
arch="$4"
setting="$5"
module="$6"
tables="$home/tables/$server"
cicat="$home/tables/cicatrsq"
logdir="$home/logs/"
cr=$'\r'

# One file: OVERWRITE and FIXCR are 0 or 1. The paths go inside single
# quotes, so one holding a single quote is refused rather than run.
copy_file() {
    local src=$1 dst=$2 overwrite=$3 fixcr=$4
    if [ "$overwrite" = 0 ] && [ -e "$dst" ]; then
        return 0
    fi
    case "$src$dst" in *"'"*) echo "refusing a path with a quote: $src" >&2; return 1 ;; esac
    if [ "$fixcr" = 1 ]; then
        sh -c "tr -d '$cr' <'$src' >'$dst'"
    else
        sh -c "cp -f '$src' '$dst'"
    fi
}

# The files directly in SRC, carriage returns removed, replacing what is there.
flat_copy() {
    local src=$1 dst=$2 f
    [ -d "$src" ] || return 0
    for f in "$src"/* "$src"/.[!.]* "$src"/..?*; do
        [ -f "$f" ] || continue
        copy_file "$f" "$dst/${f##*/}" 1 1 || return 1
    done
}

# The tree under SRC into DST, directories before their contents.
tree_copy() {
    local src=$1 dst=$2 overwrite=$3 fixcr=$4 line type rel
    [ -e "$src" ] || return 0
    while IFS= read -r line; do
        type=${line%% *}
        rel=${line#* }
        if [ "$type" = d ]; then
            [ -e "$dst/$rel" ] || mkdir "$dst/$rel" || return 1
        else
            copy_file "$src/$rel" "$dst/$rel" "$overwrite" "$fixcr" || return 1
        fi
    done < <(find "$src" -mindepth 1 -printf '%y %P\n')
}

# VXAENV: a backup under .archive, the setting replaced or added, the module
# appended to KDS_RUN, the new file copied into place.
update_env() {
    local dir=$1 file="$1/VXAENV" new="/tmp/VXAENV.new.$$" key=${setting%%=*} seen= line
    [ -f "$file" ] || return 1
    [ -d "$dir/.archive" ] || mkdir "$dir/.archive" || return 1
    sh -c "cp -f '$file' '$dir/.archive/VXAENV_$EPOCHSECONDS'" || return 1
    while IFS= read -r line || [ -n "$line" ]; do
        case "$line" in
            "$key="*) printf '%s\n' "$setting"; seen=1 ;;
            KDS_RUN=*) printf '%s;%s\n' "$line" "$module" ;;
            *) printf '%s\n' "$line" ;;
        esac
    done <"$file" >"$new"
    [ -n "$seen" ] || printf '%s\n' "$setting" >>"$new"
    sh -c "cp -f '$new' '$file'"
    local rc=$?
    rm -f "$new"
    return $rc
}

# Every SQL file of SRC through the loader, with a response file on its input.
seed() {
    local src=$1 dst=$2 rsp="/tmp/qsdseed_$$.rsp" f name lower
    [ -d "$src" ] || return 1
    export KDC_FAMILIES="PORT:1918 ip.pipe USE:Y" SQLLIB="$dst" VXA_TRC1=ERROR
    for f in "$src"/*; do
        [ -f "$f" ] || continue
        name=${f##*/}
        lower=${name,,}
        case "$lower" in
            *_del*) continue ;;
            *.sql) ;;
            *) continue ;;
        esac
        printf '%s\n%s\n%s\n%s\nend' ip.pipe "$HOSTNAME" 1918 "$name" >"$rsp"
        if ! sh -c "qdsload <'$rsp' >>'$logdir$name.log'"; then
            rm -f "$rsp"
            return 1
        fi
    done
    rm -f "$rsp"
}

flat_copy "$msrv/ATTRLIB" "$tables/ATTRLIB" &&
    flat_copy "$msrv/RKDSCATL" "$tables/RKDSCATL" &&
    flat_copy "$msrv/TECLIB" "$tables/TECLIB" &&
    flat_copy "$msrv/ATTRLIB" "$cicat/ATTRLIB" &&
    flat_copy "$msrv/RKDSCATL" "$cicat/RKDSCATL" &&
    flat_copy "$msrv/TECLIB" "$cicat/TECLIB" &&
    flat_copy "$msrv/SQLLIB" "$cicat/SQLLIB" &&
    tree_copy "$msrv/$arch/TABLE" "$tables" 1 0 &&
    tree_copy "$msrv/$arch/TABLE_PRESERVE" "$tables" 0 0 &&
    tree_copy "$msrv/$arch/lib" "$home/$arch/ms/lib" 1 0 &&
    tree_copy "$msrv/$arch/bin" "$home/$arch/ms/bin" 1 0 &&
    tree_copy "$msrv/$arch/TABLE_TXT" "$tables" 1 1 &&
    tree_copy "$msrv/$arch/TABLE_PRESERVE_TXT" "$tables" 0 1 &&
    update_env "$tables" &&
    flat_copy "$msrv/$arch/TABLE/TECLIB" "$tables/TECLIB" &&
    flat_copy "$msrv/$arch/TABLE/TECLIB" "$cicat/TECLIB" &&
    seed "$msrv/SQLLIB" "$cicat/SQLLIB"
