// The record an installing run leaves: its manifest (the plan's lines for
// what it did) in the installation's run store, and one JSON line in
// qsdinst.json beside the log, for people and for programs.
#include <cstdio>

#include "qsd/driver/driver.h"
#include "qsd/installer/installer610.h"
#include "qsd/installer/run_store.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/status.h"
#include "qsd/text/escape.h"

namespace zr7 {

namespace {

void report(const std::string& path, int error) {
    std::fflush(stdout);
    std::fprintf(stderr, "Error: Can't write <%s>\n", escape_controls(path).c_str());
    std::fprintf(stderr, "Error: <%s>: %s\n", escape_controls(path).c_str(),
                 fs::error_text(error).c_str());
}

}  // namespace

int keep_run_record(Installer610& installer, RunRecord& record, int status) {
    const std::string store_path = installer.absolute(installer.home_path + kRunStoreName);
    // A run that failed before it began its run directory begins one here.
    int error = 0;
    if (!installer.run_dir.valid())
        error = installer.home_fd.valid() ? installer.begin_run_dir(false) : EBADF;
    record.run = installer.run_id;
    const std::string manifest = store_path + "/" + record.run + "/manifest";
    const std::string failed = error == 0 ? manifest : store_path;
    if (error == zr7::kStatusCannotWrite)
        error = EIO;  // begin_run_dir wrote why
    if (error == 0) {
        error = write_run_file(installer.run_dir.get(), "manifest",
                               installer.plan.text() + installer.plan.summary() + "\n");
    }
    if (error != 0) {
        report(failed, error);
        if (status == 0)
            status = zr7::kStatusCannotWrite;
    } else {
        record.manifest = manifest;
    }

    record.rc = status;
    record.plan = &installer.plan;
    record.errors = installer.error_lines;
    const std::string line = run_record_json(record) + "\n";
    std::string dir = installer.log_dir.empty() ? installer.home_path : installer.log_dir;
    fs::UniqueFd logs;
    fs::UniqueFd json;
    error = installer.open_in_home(
        dir.size() > 1 && dir.back() == '/' ? dir.substr(0, dir.size() - 1) : dir, logs);
    if (error == 0)
        error = fs::open_append(logs.get(), "qsdinst.json", json);
    if (error == 0)
        error = fs::write_all(json.get(), line);
    if (error != 0) {
        report(installer.absolute(dir) + "qsdinst.json", error);
        if (status == 0)
            status = zr7::kStatusCannotWrite;
    }
    return status;
}

}  // namespace zr7
