// The environment file through the whole tool: an installing run with -c
// and -m against a sample server, its VXAENV and backups afterwards, and
// what a full disk or several installs at once do to them.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <set>

#include "support/test_support.h"

namespace {

using zr7test::kSampleVxaenv;
using zr7test::list_dir;
using zr7test::read_file;
using zr7test::SampleInstall;

std::vector<std::string> install_args(const SampleInstall& sample,
                                      const std::vector<std::string>& options) {
    std::vector<std::string> args{"-o", sample.home + "/logs/", "-h", sample.home, "-e"};
    args.insert(args.end(), options.begin(), options.end());
    args.push_back(sample.image);
    return args;
}

zr7test::RunResult install(const SampleInstall& sample, const std::vector<std::string>& options) {
    return zr7test::run(zr7test::tool_path(), install_args(sample, options));
}

std::string archive(const SampleInstall& sample) {
    return sample.tables() + "/.archive";
}

TEST(EnvFileInstall, SettingsAndModuleRewriteVxaenvWithABackup) {
    SampleInstall sample;
    zr7test::RunResult r = install(sample, {"-c", "kds_start=2", "-c", "NEW_KEY=v", "-m", "KZR"});
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;
    EXPECT_NE(r.out.find("Exiting with rc <0>"), std::string::npos);
    EXPECT_EQ(read_file(sample.vxaenv),
              "# server environment\n"
              "KDS_START=2\n"
              "KDS_RUN=KDSMAIN;KDSTRACE;KZR\n"
              "CT_CMSLIST=IP.PIPE:#127.0.0.1\n"
              "NEW_KEY=v\n");
    const std::vector<std::string> backups = list_dir(archive(sample));
    ASSERT_EQ(backups.size(), 1u);
    EXPECT_EQ(backups[0].rfind("VXAENV_", 0), 0u);
    EXPECT_EQ(backups[0].find_first_not_of("0123456789", 7), std::string::npos);
    EXPECT_EQ(read_file(archive(sample) + "/" + backups[0]), kSampleVxaenv);
    // No scratch file beside VXAENV.
    for (const std::string& name : list_dir(sample.tables()))
        EXPECT_EQ(name.find("VXAENV.new"), std::string::npos) << name;
}

TEST(EnvFileInstall, NothingDifferentLeavesVxaenvAndItsTime) {
    SampleInstall sample;
    const struct timespec old_times[2] = {{978307200, 0}, {978307200, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, sample.vxaenv.c_str(), old_times, 0), 0);
    zr7test::RunResult r = install(sample, {"-c", "KDS_START=1", "-m", "KDSMAIN"});
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;
    EXPECT_EQ(read_file(sample.vxaenv), kSampleVxaenv);
    struct stat st {};
    ASSERT_EQ(::stat(sample.vxaenv.c_str(), &st), 0);
    EXPECT_EQ(st.st_mtim.tv_sec, 978307200);
    EXPECT_FALSE(zr7test::exists(archive(sample)));
}

TEST(EnvFileInstall, SymbolicLinkedVxaenvKeepsItsLinkAndMode) {
    SampleInstall sample;
    const std::string real = sample.root / "real-env";
    zr7test::write_file(real, kSampleVxaenv, 0640);
    ::unlink(sample.vxaenv.c_str());
    ASSERT_EQ(::symlink(real.c_str(), sample.vxaenv.c_str()), 0);

    zr7test::RunResult r = install(sample, {"-m", "KZR"});
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;

    struct stat st {};
    ASSERT_EQ(::lstat(sample.vxaenv.c_str(), &st), 0);
    EXPECT_TRUE(S_ISLNK(st.st_mode));
    EXPECT_NE(read_file(real).find("KDS_RUN=KDSMAIN;KDSTRACE;KZR\n"), std::string::npos);
    ASSERT_EQ(::stat(real.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 07777, 0640u);
    const std::vector<std::string> backups = list_dir(archive(sample));
    ASSERT_EQ(backups.size(), 1u);
    EXPECT_EQ(read_file(archive(sample) + "/" + backups[0]), kSampleVxaenv);
}

TEST(EnvFileInstall, TwoInstallsInOneSecondKeepBothBackups) {
    SampleInstall sample;
    ASSERT_EQ(install(sample, {"-m", "MOD1"}).exit_code, 0);
    const std::string after_first = read_file(sample.vxaenv);
    ASSERT_EQ(install(sample, {"-m", "MOD2"}).exit_code, 0);
    const std::vector<std::string> backups = list_dir(archive(sample));
    ASSERT_EQ(backups.size(), 2u);
    std::set<std::string> contents{read_file(archive(sample) + "/" + backups[0]),
                                   read_file(archive(sample) + "/" + backups[1])};
    EXPECT_EQ(contents, (std::set<std::string>{kSampleVxaenv, after_first}));
}

TEST(EnvFileInstall, FullDiskGivesMinus8AndLeavesVxaenvWhole) {
    SampleInstall sample;
    const std::vector<std::string> args =
        install_args(sample, {"-m", "KZR", "-c", "BIG=" + std::string(8192, 'v')});
    std::vector<std::string> argv_text{zr7test::tool_path()};
    argv_text.insert(argv_text.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (std::string& a : argv_text)
        argv.push_back(a.data());
    argv.push_back(nullptr);
    const std::string path = zr7test::bin_dir() + ":" + (getenv("PATH") ? getenv("PATH") : "");

    // The limit is set in a child only: every file the sample copies is far
    // below it, the new VXAENV is above it.
    std::fflush(stdout);
    const pid_t pid = ::fork();
    if (pid == 0) {
        const struct rlimit limit = {4096, 4096};
        ::setrlimit(RLIMIT_FSIZE, &limit);
        std::signal(SIGXFSZ, SIG_IGN);
        const int devnull = ::open("/dev/null", O_WRONLY);
        ::dup2(devnull, STDOUT_FILENO);
        ::setenv("PATH", path.c_str(), 1);
        ::execv(argv[0], argv.data());
        ::_exit(127);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(pid, &status, 0), pid);
    ASSERT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 248);  // -8
    EXPECT_EQ(read_file(sample.vxaenv), kSampleVxaenv);
    EXPECT_FALSE(zr7test::exists(archive(sample)));
    for (const std::string& name : list_dir(sample.tables()))
        EXPECT_EQ(name.find("VXAENV.new"), std::string::npos) << name;
}

TEST(EnvFileInstall, SixInstallsAtOnceEachAddTheirModule) {
    SampleInstall sample;
    // Whole installations of the same image: the runs take turns on the
    // server, so neither the copies nor the VXAENV updates collide.
    constexpr int kRuns = 6;
    std::vector<pid_t> children;
    for (int i = 0; i < kRuns; ++i) {
        std::fflush(stdout);
        const pid_t pid = ::fork();
        if (pid == 0) {
            zr7test::RunResult r = install(sample, {"-m", "MOD" + std::to_string(i)});
            if (r.exit_code != 0)
                std::fprintf(stderr, "run %d:\n%s%s", i, r.out.c_str(), r.err.c_str());
            ::_exit(r.exit_code & 0xFF);
        }
        children.push_back(pid);
    }
    for (pid_t pid : children) {
        int status = 0;
        ASSERT_EQ(::waitpid(pid, &status, 0), pid);
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << status;
    }

    const std::string final_content = read_file(sample.vxaenv);
    for (int i = 0; i < kRuns; ++i) {
        EXPECT_NE(final_content.find("MOD" + std::to_string(i)), std::string::npos)
            << final_content;
    }
    // Every backup is a whole earlier state: the sample with 0 to 5 of the
    // modules added, each number once.
    const std::vector<std::string> backups = list_dir(archive(sample));
    ASSERT_EQ(backups.size(), static_cast<std::size_t>(kRuns));
    std::multiset<long> added;
    for (const std::string& name : backups) {
        const std::string text = read_file(archive(sample) + "/" + name);
        const std::size_t at = text.find("KDS_RUN=KDSMAIN;KDSTRACE");
        ASSERT_NE(at, std::string::npos) << text;
        const std::size_t end = text.find('\n', at);
        ASSERT_NE(end, std::string::npos) << text;
        const std::string list = text.substr(at, end - at);
        added.insert(std::count(list.begin(), list.end(), ';') - 1);
        EXPECT_EQ(text.substr(0, at) + "KDS_RUN=KDSMAIN;KDSTRACE" + text.substr(end),
                  kSampleVxaenv);
    }
    EXPECT_EQ(added, (std::multiset<long>{0, 1, 2, 3, 4, 5}));
}

}  // namespace
