#!/usr/bin/python
# -*- coding: utf-8 -*-
# Drives zr7inst on a managed monitoring server: installs a product's
# support from an image (state=present) or undoes the newest installation
# (state=undone). Check mode asks the tool for its plan (-n); a real run
# reads what the tool recorded in <home>/logs/qsdinst.json.

from __future__ import absolute_import, division, print_function

__metaclass__ = type

DOCUMENTATION = r"""
---
module: zr7inst
short_description: Install a product's support into a monitoring server with zr7inst
description:
  - Runs the C(zr7inst) tool installed on the managed host, with an argument
    vector (no shell), to install a product's support material from a source
    image into a monitoring server's installation directory, or to undo the
    newest installation that is not undone yet.
  - In check mode the tool only shows its plan (C(zr7inst -n)); nothing on the
    host changes. C(changed) then says whether the real run would change
    anything, and with C(--diff) the plan is shown as the difference (the
    C(VXAENV) difference and the files that would be created, replaced,
    removed or restored).
  - A real run reports C(changed) and the counts from the record that the run
    appended to C(<home>/logs/qsdinst.json). A failed run fails the task with
    the tool's exit status, its C(Error:) lines and the path of its log.
version_added: "1.0.0"
author:
  - zr7inst developers
options:
  home:
    description:
      - The server's installation directory (C(-h)).
    type: path
    required: true
  image:
    description:
      - The source image directory, the one that holds C(MSRV).
      - Required with I(state=present). With I(state=undone) it restricts the
        undo to an installation of this image (see I(state)).
    type: path
  settings:
    description:
      - Settings written into C(VXAENV), one C(-c key=value) each. Quote
        values that YAML would read as booleans.
    type: dict
    default: {}
  modules:
    description:
      - Module names appended to the C(KDS_RUN) list in C(VXAENV), passed
        joined by C(;) as one C(-m) argument.
    type: list
    elements: str
    default: []
  copy:
    description:
      - Copy the image's files and update C(VXAENV). C(false) seeds only (C(-s)).
    type: bool
    default: true
  seed:
    description:
      - Seed the image's SQL files into the server's catalog. C(false) copies
        only (C(-e)).
    type: bool
    default: true
  state:
    description:
      - C(present) installs the image.
      - C(undone) undoes the newest installation that is not undone yet
        (C(zr7inst -u)). When I(image) is given as well, the undo is made only
        when that newest installation is of I(image); otherwise the task
        changes nothing. When there is nothing to undo, the task changes
        nothing and does not fail.
    type: str
    choices: [present, undone]
    default: present
  executable:
    description:
      - The tool's path. By default C(zr7inst) is looked up on C(PATH).
      - The server's loader C(qdsload) must be on C(PATH) when seeding.
    type: path
notes:
  - Supports check mode and diff mode.
  - The catalog seeded from SQL files cannot be undone; an undo lists those
    files as C(seeded).
requirements:
  - zr7inst with preview (C(-n)), record (C(qsdinst.json)) and undo (C(-u)) on
    the managed host.
"""

EXAMPLES = r"""
- name: Install the KZR product's support
  zr7inst:
    home: /opt/marlin
    image: /srv/images/kzr-610
    settings:
      KZR_HISTORY_HOURS: 24
    modules: [kzr]

- name: Copy only, seed later
  zr7inst:
    home: /opt/marlin
    image: /srv/images/kzr-610
    seed: false

- name: Undo the KZR installation, where it is the newest one
  zr7inst:
    home: /opt/marlin
    image: /srv/images/kzr-610
    state: undone
"""

RETURN = r"""
changed:
  description: Whether the run changed (check mode, would change) the server.
  returned: always
  type: bool
rc:
  description: The tool's exit status.
  returned: when the tool ran, except when there was nothing to undo
  type: int
  sample: 0
exit_status:
  description: The tool's exit status when there was nothing to undo (244), which fails no task.
  returned: when an undo found nothing to undo
  type: int
  sample: 244
cmd:
  description: The argument vector the tool was started with.
  returned: when the tool ran
  type: list
  elements: str
counts:
  description:
    - The number of actions of each kind, from the plan in check mode and from
      the run's record otherwise.
    - Installs count C(mkdir), C(create), C(replace), C(same), C(keep),
      C(vxaenv), C(backup), C(seed), C(pass), C(error); undos count
      C(restore), C(remove), C(rmdir), C(vxaenv), C(backup), C(seeded),
      C(conflict), C(error).
  returned: when the tool ran and reported them
  type: dict
  sample: {"mkdir": 0, "create": 3, "replace": 1, "same": 20, "keep": 2, "vxaenv": 1,
           "backup": 1, "seed": 4, "pass": 1, "error": 0}
plan:
  description: The plan, one entry per action (check mode; and a real run's manifest).
  returned: in check mode, and after a real run that left a manifest
  type: list
  elements: dict
  sample: [{"action": "create", "path": "/opt/marlin/tables/HUB01/ATTRLIB/kzr.atr"}]
record:
  description: The record the run appended to C(<home>/logs/qsdinst.json).
  returned: after a real run that wrote one
  type: dict
errors:
  description: The tool's C(Error:) lines.
  returned: when the tool reported errors
  type: list
  elements: str
  sample: ["Error: Can't open kmsenv", "Error: /opt/marlin/config/.ConfigData/kmsenv: No such file or directory"]
log:
  description: The path of the installation's log (null when the tool refused to start one).
  returned: after a real run
  type: str
  sample: /opt/marlin/logs/qsdinst.log
stdout:
  description: The tool's standard output.
  returned: when the tool ran
  type: str
stderr:
  description: The tool's standard error.
  returned: when the tool ran
  type: str
"""

import json
import os
import re

from ansible.module_utils.basic import AnsibleModule

# The actions that change the server, as the record's "changed" counts them.
INSTALL_CHANGES = ("mkdir", "create", "replace", "vxaenv", "seed")
UNDO_CHANGES = ("restore", "remove", "rmdir", "vxaenv")
# The order the lists appear in under --diff.
DIFF_LISTS = (
    ("mkdir", "directories made"),
    ("create", "files created"),
    ("replace", "files replaced"),
    ("seed", "SQL files seeded"),
    ("restore", "files restored"),
    ("remove", "files removed"),
    ("rmdir", "directories removed"),
    ("conflict", "changed since installed, left alone"),
)
NOTHING_TO_UNDO = "Error: Nothing to undo"
RECORD_NAME = "qsdinst.json"
# The tool's store of runs in the home: a directory per run, named from a
# six-digit sequence number; an installing run keeps its journal there, and
# an undo marks the run it took back.
RUN_STORE = ".zr7inst"
RUN_DIR_NAME = re.compile(r"^[0-9]{6}-")
JOURNAL_NAME = "journal"
UNDONE_NAME = "undone"
LOG_NAME = "qsdinst.log"
FAILED_LINE = re.compile(r"installation failed with exit status -?\d+; see (.+)$")


def build_arguments(params, preview):
    """The tool's arguments (without the tool itself) for the task's parameters."""
    args = []
    if preview:
        args.append("-n")
    if params["state"] == "undone":
        return args + ["-u", "-h", params["home"]]
    for key, value in (params.get("settings") or {}).items():
        args += ["-c", "%s=%s" % (key, value)]
    modules = params.get("modules") or []
    if modules:
        args += ["-m", ";".join(modules)]
    if not params["copy"]:
        args.append("-s")
    if not params["seed"]:
        args.append("-e")
    return args + ["-h", params["home"], params["image"]]


def parameter_problem(params):
    """What is wrong with the parameters, or None."""
    if params["state"] == "present" and not params.get("image"):
        return "image is required when state is present"
    if params["state"] == "present" and not params["copy"] and not params["seed"]:
        return "copy and seed are both false: there is nothing to do"
    for key, value in (params.get("settings") or {}).items():
        if isinstance(value, bool):
            return "settings.%s is a boolean; quote the value to pass it as text" % key
        if isinstance(value, (dict, list)) or value is None:
            return "settings.%s must be a single value" % key
        if not key or "=" in key:
            return "settings key %r is not a valid name" % key
    for name in params.get("modules") or []:
        if ";" in name or not name.strip():
            return "module name %r is empty or holds ';'" % name
    return None


def unescape_path(text):
    """The path of a plan line, its escapes (\\\\ \\n \\t \\r \\xHH) undone."""
    out = bytearray()
    raw = text.encode("utf-8", "surrogateescape")
    i = 0
    while i < len(raw):
        byte = raw[i : i + 1]
        if byte == b"\\" and i + 1 < len(raw):
            nxt = raw[i + 1 : i + 2]
            simple = {b"\\": b"\\", b"n": b"\n", b"t": b"\t", b"r": b"\r"}
            if nxt in simple:
                out += simple[nxt]
                i += 2
                continue
            if nxt == b"x" and re.fullmatch(rb"[0-9a-fA-F]{2}", raw[i + 2 : i + 4]):
                out.append(int(raw[i + 2 : i + 4], 16))
                i += 4
                continue
        out += byte
        i += 1
    return out.decode("utf-8", "surrogateescape")


def parse_plan(text):
    """Splits the preview's standard output (or a manifest) into its actions,
    the VXAENV difference and the summary's counts."""
    actions = []
    vxaenv_diff = []
    counts = {}
    in_diff = False
    for line in text.splitlines():
        if line.startswith("  ") and in_diff:
            vxaenv_diff.append(line[2:])
            continue
        in_diff = False
        if line.startswith("summary:"):
            words = line[len("summary:") :].split()
            for name, number in zip(words[0::2], words[1::2]):
                try:
                    counts[name] = int(number)
                except ValueError:
                    pass
            continue
        action, _, rest = line.partition(" ")
        if not action:
            continue
        if action == "error":
            actions.append({"action": action, "text": rest})
            continue
        actions.append({"action": action, "path": unescape_path(rest)})
        in_diff = action == "vxaenv"
    return {"actions": actions, "vxaenv_diff": vxaenv_diff, "counts": counts}


def plan_changes(counts, undo):
    """Whether a run with these counts changes the server."""
    return any(counts.get(name, 0) > 0 for name in (UNDO_CHANGES if undo else INSTALL_CHANGES))


def plan_diff(plan, home):
    """The plan as Ansible's diff: the VXAENV difference, then the lists."""
    diffs = []
    if plan["vxaenv_diff"]:
        diffs.append({"prepared": "\n".join(plan["vxaenv_diff"]) + "\n"})
    lines = []
    for action, heading in DIFF_LISTS:
        paths = [a["path"] for a in plan["actions"] if a["action"] == action]
        if paths:
            lines.append("%s (%d):" % (heading, len(paths)))
            lines += ["  " + p for p in paths]
    if lines:
        diffs.append({"prepared": "zr7inst in %s\n%s\n" % (home, "\n".join(lines))})
    return diffs


def error_lines(stderr):
    """The tool's "Error:" lines."""
    return [line for line in stderr.splitlines() if line.startswith("Error: ")]


def nothing_to_undo(errors):
    """Whether an undo failed only for want of an installation to undo."""
    return len(errors) == 1 and errors[0].startswith(NOTHING_TO_UNDO)


def without_rc(result):
    """A result that is no failure although the tool's status is not 0:
    Ansible fails any task whose result has a non-zero rc, so the status
    goes under exit_status."""
    result = dict(result)
    result["exit_status"] = result.pop("rc")
    return result


def reason(errors, stderr):
    """The reason of a failure in one line: the "Error:" lines, else the
    tool's first line on standard error (a refused command line)."""
    if errors:
        return "; ".join(errors)
    lines = [line for line in stderr.splitlines() if line.strip()]
    return lines[0] if lines else "no message"


def log_path(stderr, home, exists=os.path.exists):
    """The log the tool named on failure, else the one a run in home writes
    when there is one (a run refused before it started writes none)."""
    for line in reversed(stderr.splitlines()):
        match = FAILED_LINE.search(line)
        if match:
            return match.group(1)
    default = os.path.join(home, "logs", LOG_NAME)
    return default if exists(default) else None


def appended_records(data):
    """The records in bytes appended to the record file; a line that is not
    (yet) a whole JSON object is skipped."""
    records = []
    for line in data.split(b"\n"):
        if not line.strip():
            continue
        try:
            record = json.loads(line.decode("utf-8", "surrogateescape"))
        except ValueError:
            continue
        if isinstance(record, dict):
            records.append(record)
    return records


def own_record(records, operation, arguments):
    """This run's record among the appended ones: the last of its operation
    whose arguments are this run's (another run may have appended too)."""
    for record in reversed(records):
        if record.get("operation") == operation and record.get("arguments") == arguments:
            return record
    return None


def newest_undoable(runs):
    """The run an undo takes back, as the tool chooses it: the newest run
    directory (names sort in the order the runs began) that holds a journal
    and no mark of its undo. `runs` holds (name, has_journal, is_undone)."""
    for name, journal, undone in sorted(runs, reverse=True):
        if RUN_DIR_NAME.match(name) and journal and not undone:
            return name
    return None


def install_record(records, run):
    """The record of the installing run `run`, or None."""
    for record in records:
        if record.get("operation") == "install" and record.get("run") == run:
            return record
    return None


def same_directory(a, b):
    return a is not None and b is not None and os.path.normpath(a) == os.path.normpath(b)


def read_from(path, offset):
    """The bytes of path past offset (all of it when the file shrank)."""
    try:
        with open(path, "rb") as handle:
            handle.seek(0, os.SEEK_END)
            if handle.tell() < offset:
                offset = 0
            handle.seek(offset)
            return handle.read()
    except (IOError, OSError):
        return b""


def file_size(path):
    try:
        return os.stat(path).st_size
    except (IOError, OSError):
        return 0


def read_text(path):
    try:
        with open(path, "rb") as handle:
            return handle.read().decode("utf-8", "surrogateescape")
    except (IOError, OSError, TypeError):
        return None


def store_runs(home):
    """The run directories of the home's store, as newest_undoable takes them."""
    store = os.path.join(home, RUN_STORE)
    try:
        names = os.listdir(store)
    except (IOError, OSError):
        return []
    return [
        (
            name,
            os.path.isfile(os.path.join(store, name, JOURNAL_NAME)),
            os.path.lexists(os.path.join(store, name, UNDONE_NAME)),
        )
        for name in names
    ]


def guard_undo(module, record_file):
    """With an image given, undo only an installation of that image."""
    image = module.params.get("image")
    if module.params["state"] != "undone" or not image:
        return
    home = module.params["home"]
    run = newest_undoable(store_runs(home))
    if run is None:
        module.exit_json(changed=False, msg="Nothing to undo")
    record = install_record(appended_records(read_from(record_file, 0)), run)
    newest = record.get("image") if record else None
    if not same_directory(newest, image):
        module.exit_json(
            changed=False,
            run=run,
            msg="The newest installation in %s (run %s) is not of %s but of %s; nothing undone"
            % (home, run, image, newest or "an image it has no record of"),
        )


def preview(module, tool):
    """Check mode: the plan, nothing changed."""
    params = module.params
    undo = params["state"] == "undone"
    cmd = [tool] + build_arguments(params, True)
    rc, stdout, stderr = module.run_command(cmd)
    plan = parse_plan(stdout)
    errors = error_lines(stderr) or [
        "Error: " + a["text"] for a in plan["actions"] if a["action"] == "error"
    ]
    result = dict(
        rc=rc,
        cmd=cmd,
        counts=plan["counts"],
        plan=plan["actions"],
        stdout=stdout,
        stderr=stderr,
        errors=errors,
    )
    if undo and rc != 0 and nothing_to_undo(errors):
        module.exit_json(changed=False, msg="Nothing to undo", **without_rc(result))
    if rc != 0:
        module.fail_json(
            changed=False, msg="zr7inst would fail with exit status %d: %s" % (rc, reason(errors, stderr)), **result
        )
    if module._diff:
        result["diff"] = plan_diff(plan, params["home"])
    module.exit_json(changed=plan_changes(plan["counts"], undo), **result)


def run(module, tool, record_file):
    """A real run: the outcome from the record it appended."""
    params = module.params
    undo = params["state"] == "undone"
    arguments = build_arguments(params, False)
    cmd = [tool] + arguments
    offset = file_size(record_file)
    rc, stdout, stderr = module.run_command(cmd)
    record = own_record(
        appended_records(read_from(record_file, offset)), "undo" if undo else "install", arguments
    )
    errors = error_lines(stderr) or (record or {}).get("errors") or []
    result = dict(rc=rc, cmd=cmd, stdout=stdout, stderr=stderr, errors=errors, log=log_path(stderr, params["home"]))
    if record is not None:
        result["record"] = record
        result["counts"] = record.get("counts") or {}
        manifest = read_text(record.get("manifest"))
        if manifest is not None:
            plan = parse_plan(manifest)
            result["plan"] = plan["actions"]
            if module._diff:
                result["diff"] = plan_diff(plan, params["home"])
    changed = bool(record.get("changed")) if record is not None else False
    if undo and rc != 0 and nothing_to_undo(errors):
        module.exit_json(changed=changed, msg="Nothing to undo", **without_rc(result))
    if rc != 0:
        msg = "zr7inst failed with exit status %d: %s" % (rc, reason(errors, stderr))
        if result["log"]:
            msg += "; see %s" % result["log"]
        module.fail_json(changed=changed, msg=msg, **result)
    module.exit_json(changed=changed, **result)


def main():
    module = AnsibleModule(
        argument_spec=dict(
            home=dict(type="path", required=True),
            image=dict(type="path"),
            settings=dict(type="dict", default={}),
            modules=dict(type="list", elements="str", default=[]),
            copy=dict(type="bool", default=True),
            seed=dict(type="bool", default=True),
            state=dict(type="str", choices=["present", "undone"], default="present"),
            executable=dict(type="path"),
        ),
        supports_check_mode=True,
    )
    problem = parameter_problem(module.params)
    if problem:
        module.fail_json(msg=problem)
    tool = module.params["executable"] or module.get_bin_path("zr7inst", required=True)
    record_file = os.path.join(module.params["home"], "logs", RECORD_NAME)
    guard_undo(module, record_file)
    if module.check_mode:
        preview(module, tool)
    run(module, tool, record_file)


if __name__ == "__main__":
    main()
