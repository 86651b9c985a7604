#!/usr/bin/env bash
# The fleet test: the Ansible module and role of contrib/ansible drive the
# zr7inst found on PATH (with the stand-in loader qdsload) across five local
# "servers", each a copy of examples/sample/home under a scratch directory.
#   fleet.yml     check mode, the real run, a second run, a failing host, undo
#   rollout.yml   batches that stop at the first failure; expect.yml checks
#                 who installed; undo.yml then gives every server back its state
# Exits non-zero on the first failed expectation. KEEP=1 keeps the scratch
# directory for a look afterwards.
set -euo pipefail

here=$(cd "$(dirname "$0")" && pwd)
repo=$(cd "$here/../../.." && pwd)
contrib=$repo/contrib/ansible

for program in zr7inst qdsload ansible-playbook; do
    if ! command -v "$program" >/dev/null 2>&1; then
        echo "test-ansible: $program is not on PATH" >&2
        exit 1
    fi
done
# The Python that runs Ansible also runs the test's helper, on every machine.
python=$(sed -n '1s/^#! *\([^ ]*\).*/\1/p' "$(command -v ansible-playbook)")
[ -x "$python" ] || python=python3

work=$(mktemp -d "${TMPDIR:-/tmp}/zr7-fleet.XXXXXX")
# Ansible's own temporary directories go through a shell of its own, which
# takes no blank in their path: they stay below /tmp whatever TMPDIR says.
ansible_tmp=$(mktemp -d /tmp/zr7-ansible.XXXXXX)
if [ "${KEEP:-0}" = 1 ]; then
    echo "test-ansible: scratch directory $work"
    trap 'rm -rf "$ansible_tmp"' EXIT
else
    trap 'rm -rf "$work" "$ansible_tmp"' EXIT
fi

# One image for every server; srv3's kmsenv names an architecture that would
# lead out of its directory, which the tool refuses.
cp -R "$repo/examples/sample/image" "$work/image"
cp -R "$repo/examples/sample/image" "$work/image2"
hosts=(srv1 srv2 srv3 srv4 srv5)
for host in "${hosts[@]}"; do
    cp -R "$repo/examples/sample/home" "$work/$host"
    find "$work/$host" -name .keep -type f -delete
done
sed -i 's/^HUB01|BINARCH|lx8266|$/HUB01|BINARCH|..\/lx8266|/' "$work/srv3/config/.ConfigData/kmsenv"
grep -q 'BINARCH|\.\./lx8266|' "$work/srv3/config/.ConfigData/kmsenv"

# The inventory, written as JSON so that any scratch path is taken as it is.
"$python" - "$work" "$here/tree.py" "${hosts[@]}" >"$work/hosts.json" <<'PY'
import json, sys
work, tree, hosts = sys.argv[1], sys.argv[2], sys.argv[3:]
group = {
    "vars": {
        "ansible_connection": "local",
        "ansible_python_interpreter": "{{ ansible_playbook_python }}",
        "zr7inst_image": work + "/image",
        "zr7_work": work,
        "zr7_tree": tree,
    },
    "hosts": {host: {"zr7inst_home": work + "/" + host} for host in hosts},
}
group["hosts"]["srv3"]["zr7_broken"] = True
json.dump({"zr7_servers": group}, sys.stdout, indent=2)
PY

# Nothing of the machine's own Ansible set-up takes part.
export ANSIBLE_CONFIG=$here/ansible.cfg
export ANSIBLE_LIBRARY=$contrib/roles/zr7inst/library
export ANSIBLE_ROLES_PATH=$contrib/roles
export ANSIBLE_LOCAL_TEMP=$ansible_tmp/local
export ANSIBLE_REMOTE_TEMP=$ansible_tmp/remote
export ANSIBLE_NOCOLOR=1
unset MARLIN_HOME MARLINHOME VXA_TRC1

playbook() {
    echo "===== ansible-playbook $*"
    ansible-playbook -i "$work/hosts.json" "$@"
}

started=$(date +%s)
# The module's documentation must parse, as ansible-doc shows it.
ansible-doc -t module zr7inst >/dev/null
if command -v ansible-lint >/dev/null 2>&1; then
    echo "===== ansible-lint"
    (cd "$repo" && ansible-lint --offline -p contrib/ansible/rollout.yml contrib/ansible/undo.yml \
        contrib/ansible/roles/zr7inst contrib/ansible/tests/fleet.yml contrib/ansible/tests/expect.yml)
else
    echo "===== ansible-lint is not installed: the role and playbooks are not linted"
fi
for host in "${hosts[@]}"; do
    "$python" "$here/tree.py" --state "$work/$host" >"$work/$host.state"
done

playbook "$here/fleet.yml" -e zr7_phase=fleet

# The rollout in batches of two: srv1 and srv2 install, srv3 fails, srv4
# (in srv3's batch) installs, srv5 is never started.
set +e
playbook "$contrib/rollout.yml" -e zr7inst_batch=2 >"$work/rollout.out" 2>&1
status=$?
set -e
cat "$work/rollout.out"
if [ "$status" -eq 0 ]; then
    echo "test-ansible: the rollout with a failing server ended with status 0" >&2
    exit 1
fi
grep -q 'NO MORE HOSTS LEFT' "$work/rollout.out"
playbook "$here/expect.yml" -e zr7_phase=rollout
playbook "$contrib/undo.yml"
playbook "$here/expect.yml" -e zr7_phase=undone

echo "test-ansible: every expectation met in $(($(date +%s) - started)) s (${#hosts[@]} servers)"
