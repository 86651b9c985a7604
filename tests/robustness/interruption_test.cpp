// Runs that are killed at any moment, and runs that meet: VXAENV is at every
// moment the old file or the new one, whole; every backup is a whole earlier
// state; a following run completes; no run's change is lost.
#include <gtest/gtest.h>
#include <signal.h>

#include <chrono>
#include <cstdlib>
#include <functional>
#include <random>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "robustness/robustness_support.h"

namespace {

using zr7test::read_file;
using zr7test::SampleInstall;

// About a mebibyte of settings with the module list in the middle: the
// rewrite, the backup and the replacement each take long enough to be hit.
std::string large_vxaenv(int lines) {
    std::string text = "# server environment\n";
    for (int i = 0; i < lines; ++i) {
        if (i == lines / 2)
            text += "KDS_RUN=KDSMAIN;KDSTRACE\n";
        text += "SETTING_" + std::to_string(i) + "=value of setting number " + std::to_string(i) +
                " of the server\n";
    }
    return text;
}

std::string run_output(const std::string& path) {
    const std::string text = read_file(path);
    return text.size() > 3000 ? text.substr(text.size() - 3000) : text;
}

TEST(Kills, VxaenvIsAlwaysOldOrNewAndEveryBackupWhole) {
    SampleInstall s;
    zr7test::write_file(s.vxaenv, large_vxaenv(20000));
    const char* seed_text = std::getenv("ZR7_SEED");
    const unsigned seed =
        seed_text != nullptr ? unsigned(std::strtoul(seed_text, nullptr, 10)) : 8u;
    std::mt19937 random(seed);
    std::printf("[ figures  ] kill moments drawn with ZR7_SEED=%u\n", seed);

    // A whole run first, for how long one lasts.
    std::hash<std::string> hash;
    std::set<std::size_t> states{hash(read_file(s.vxaenv))};
    const auto began = std::chrono::steady_clock::now();
    ASSERT_EQ(zr7rb::run_captured(zr7rb::install_launch(s, zr7rb::change_options(0))).exit_code, 0);
    const auto run_length = std::chrono::steady_clock::now() - began;
    std::uniform_int_distribution<long long> moment(
        0, std::chrono::duration_cast<std::chrono::microseconds>(run_length).count() * 6 / 5);

    const int kills = zr7rb::scaled(12, 200);
    int after_change = 0;
    std::set<std::string> checked;
    const std::string output = s.root / "run.out";
    for (int k = 1; k <= kills; ++k) {
        const std::string old_content = read_file(s.vxaenv);
        const std::string new_content = zr7rb::changed_by(old_content, k);
        states.insert(hash(old_content));
        zr7rb::Launch launch = zr7rb::install_launch(s, zr7rb::change_options(k));
        launch.output_path = output;
        const pid_t pid = zr7rb::start(launch);
        std::this_thread::sleep_for(std::chrono::microseconds(moment(random)));
        ::kill(-pid, SIGKILL);
        zr7rb::wait_for(pid);

        const std::string now = read_file(s.vxaenv);
        ASSERT_TRUE(now == old_content || now == new_content) << "kill " << k;
        after_change += now == new_content ? 1 : 0;
        for (const std::string& backup : zr7rb::backups(s)) {
            if (checked.insert(backup).second) {
                ASSERT_EQ(states.count(hash(read_file(backup))), 1u) << backup;
            }
        }
        const zr7test::RunResult again =
            zr7rb::run_captured(zr7rb::install_launch(s, zr7rb::change_options(k)));
        ASSERT_EQ(again.exit_code, 0)
            << "after kill " << k << ": " << again.err << run_output(output);
        ASSERT_TRUE(read_file(s.vxaenv) == new_content) << "after kill " << k;
    }
    zr7rb::report("kills survived", kills);
    zr7rb::report("kills after VXAENV was replaced", after_change);
    zr7rb::report("backups checked whole", static_cast<long long>(checked.size()));
}

TEST(Concurrency, EightRunsAtOnceAllKeepTheirChange) {
    SampleInstall s;
    // Many sub-directories, which every run creates when it finds them
    // missing: the runs meet there as well as at VXAENV.
    for (int d = 0; d < 100; ++d) {
        const std::string dir = s.image + "/MSRV/" + s.arch + "/TABLE/dir" + std::to_string(d);
        zr7test::make_dirs(dir + "/inner");
        zr7test::write_file(dir + "/inner/file", "in " + dir + "\n");
    }
    constexpr int kRuns = 8;
    std::vector<pid_t> pids;
    for (int n = 0; n < kRuns; ++n) {
        zr7rb::Launch launch = zr7rb::install_launch(s, zr7rb::change_options(n));
        launch.output_path = s.root / ("run" + std::to_string(n) + ".out");
        pids.push_back(zr7rb::start(launch));
    }
    for (int n = 0; n < kRuns; ++n) {
        EXPECT_EQ(zr7rb::wait_for(pids[n]), 0)
            << "run " << n << ":\n"
            << run_output(s.root / ("run" + std::to_string(n) + ".out"));
    }

    // The runs took turns: from the sample, each step is one run's change,
    // each backup is the state before one step, and the file is the last.
    std::multiset<std::string> backed_up;
    for (const std::string& backup : zr7rb::backups(s))
        backed_up.insert(read_file(backup));
    std::string state = zr7test::kSampleVxaenv;
    std::set<int> pending;
    for (int n = 0; n < kRuns; ++n)
        pending.insert(n);
    const std::string final_content = read_file(s.vxaenv);
    while (!pending.empty()) {
        ASSERT_EQ(backed_up.count(state), 1u) << "no backup of\n" << state;
        backed_up.erase(state);
        int next = -1;
        for (int n : pending) {
            const std::string after = zr7rb::changed_by(state, n);
            if (backed_up.count(after) == 1 || (pending.size() == 1 && after == final_content))
                next = n;
        }
        ASSERT_NE(next, -1) << "no run's change leads on from\n" << state;
        state = zr7rb::changed_by(state, next);
        pending.erase(next);
    }
    EXPECT_EQ(final_content, state);
    EXPECT_TRUE(backed_up.empty());
    zr7rb::report("concurrent runs", kRuns);
}

}  // namespace
