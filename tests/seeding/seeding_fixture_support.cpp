#include "seeding/seeding_fixture.h"

#include <unistd.h>

#include <cstdlib>

#include "qsd/platform/trace.h"
#include "support/stdout_capture.h"

namespace {

// Variables the tests or the code under test change.
const char* const kTouched[] = {"PATH",   "QDSLOAD_FAIL", "QDSLOAD_RECORD",
                                "SQLLIB", "KDC_FAMILIES", "VXA_TRC1"};

}  // namespace

void SeedingTest::SetUp() {
    for (const char* name : kTouched) {
        const char* value = std::getenv(name);
        if (value != nullptr)
            saved_[name] = value;
    }
    const std::string path = saved_.count("PATH") != 0 ? saved_["PATH"] : "/usr/bin:/bin";
    ::setenv("PATH", (zr7test::bin_dir() + ":" + path).c_str(), 1);
    ::unsetenv("QDSLOAD_FAIL");
    ::setenv("QDSLOAD_RECORD", record.c_str(), 1);
    zr7test::make_dirs(sqllib);
    zr7test::make_dirs(scratch);
    zr7test::make_dirs(logs);
    zr7test::make_dirs(record);
    installer.protocol = "ip.pipe";
    installer.host_name = "host1";
    installer.port = "7000";
    installer.family_setting = "KDC_FAMILIES=PORT:7000 ip.pipe USE:Y";
    installer.tmp_path = scratch + "/";
    installer.log_dir = logs + "/";
}

void SeedingTest::TearDown() {
    for (const char* name : kTouched) {
        auto found = saved_.find(name);
        if (found == saved_.end())
            ::unsetenv(name);
        else
            ::setenv(name, found->second.c_str(), 1);
    }
    zr7::trace_reconfigure("ERROR");
}

std::string SeedingTest::response_path() const {
    return scratch + "/qsdseed_" + std::to_string(::getpid()) + ".rsp";
}

std::string SeedingTest::catalog() const {
    return zr7test::read_file(tmp / "tables/cicatrsq/qdsload.catalog");
}

int SeedingTest::catalog_count(const std::string& file_name) const {
    const std::string text = catalog();
    const std::string key = " loaded <" + file_name + "> ";
    int count = 0;
    for (std::size_t at = text.find(key); at != std::string::npos; at = text.find(key, at + 1))
        ++count;
    return count;
}

std::string SeedingTest::recorded_response(const std::string& file_name) const {
    return zr7test::read_file(record + "/" + file_name + ".rsp");
}

std::string SeedingTest::recorded_environment(const std::string& file_name) const {
    return zr7test::read_file(record + "/" + file_name + ".env");
}

int SeedingTest::run_traced(const std::function<int()>& body) {
    zr7::trace_reconfigure("ALL");
    int status = 0;
    out = zr7test::capture_stdout([&] { status = body(); });
    zr7::trace_reconfigure("ERROR");
    return status;
}

bool trace_lines_in_order(const std::string& output, const std::vector<std::string>& messages) {
    std::size_t from = 0;
    for (const std::string& message : messages) {
        const std::size_t at = output.find(") " + message + "\n", from);
        if (at == std::string::npos)
            return false;
        from = at + 1;
    }
    return true;
}
