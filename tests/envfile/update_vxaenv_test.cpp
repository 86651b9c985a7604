// The environment file update against real files: what VXAENV holds
// afterwards, its backups, its mode, owner, time and link, and what a full
// disk or several runs at once do to it.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <functional>
#include <set>

#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"
#include "support/test_support.h"

namespace {

using zr7test::kSampleVxaenv;
using zr7test::list_dir;
using zr7test::read_file;
using zr7test::write_file;

const char* const kTemplate = "${HOMEPATH}/tables/${QMSNAME}";

// Runs `body` in a child process and returns its exit status (0..255), so a
// limit set there does not reach the test process.
int in_child(const std::function<int()>& body) {
    std::fflush(stdout);
    const pid_t pid = ::fork();
    if (pid == 0)
        ::_exit(body() & 0xFF);
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0) {
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

class UpdateVxaenvTest : public ::testing::Test {
  protected:
    zr7test::TempDir root;
    std::string tables;
    std::string vxaenv;

    void SetUp() override {
        tables = root / "tables/SRV1";
        zr7test::make_dirs(tables);
        vxaenv = tables + "/VXAENV";
        write_file(vxaenv, kSampleVxaenv);
    }

    void prepare(Installer610& installer) const {
        installer.add_path_symbol("HOMEPATH", (root.path() + "/").c_str());
        installer.add_symbol("QMSNAME", "SRV1");
        installer.tmp_path = "/tmp/";
    }

    // One update with the given module name and "-c" settings.
    int update(const std::string& module, const std::vector<std::string>& settings) const {
        Installer610 installer;
        prepare(installer);
        installer.module_name = module;
        for (const std::string& setting : settings) {
            if (installer.addVar(setting.c_str()) != 0)
                return -100;
        }
        return installer.update_vxaenv(kTemplate);
    }

    std::string archive() const { return tables + "/.archive"; }
};

TEST_F(UpdateVxaenvTest, NothingRequestedOpensNothing) {
    ::chmod(vxaenv.c_str(), 0);
    EXPECT_EQ(update("", {}), 0);
    EXPECT_EQ(list_dir(tables), std::vector<std::string>{"VXAENV"});
}

TEST_F(UpdateVxaenvTest, BadTemplateFailsEvenWithNothingRequested) {
    Installer610 installer;
    prepare(installer);
    EXPECT_EQ(installer.update_vxaenv("${NOPE}/tables"), -1);
    EXPECT_EQ(installer.update_vxaenv(""), -1);
}

TEST_F(UpdateVxaenvTest, SettingsAndModuleRewriteTheFileAndKeepABackup) {
    Installer610 installer;
    prepare(installer);
    installer.module_name = "KZR";
    ASSERT_EQ(installer.addVar("kds_start=2"), 0);
    ASSERT_EQ(installer.addVar("NEW_KEY = v"), 0);
    ASSERT_EQ(installer.update_vxaenv(kTemplate), 0);

    EXPECT_EQ(read_file(vxaenv),
              "# server environment\n"
              "KDS_START=2\n"
              "KDS_RUN=KDSMAIN;KDSTRACE;KZR\n"
              "CT_CMSLIST=IP.PIPE:#127.0.0.1\n"
              "NEW_KEY=v\n");
    const std::vector<std::string> backups = list_dir(archive());
    ASSERT_EQ(backups.size(), 1u);
    EXPECT_EQ(backups[0].rfind("VXAENV_", 0), 0u);
    EXPECT_EQ(backups[0].find_first_not_of("0123456789", 7), std::string::npos);
    EXPECT_EQ(read_file(archive() + "/" + backups[0]), kSampleVxaenv);
    // No scratch file left beside the file.
    EXPECT_EQ(list_dir(tables), (std::vector<std::string>{".archive", "VXAENV"}));
    // The applied setting was consumed, the appended one stays.
    EXPECT_EQ(installer.settings.size(), 1u);
    EXPECT_NE(installer.settings.find("NEW_KEY"), nullptr);
}

TEST_F(UpdateVxaenvTest, TraceNamesTheScratchFileBesideTheFile) {
    zr7::trace_reconfigure("ALL");
    ::testing::internal::CaptureStdout();
    const int status = update("KZR", {});
    const std::string trace = ::testing::internal::GetCapturedStdout();
    zr7::trace_reconfigure("ERROR");
    ASSERT_EQ(status, 0);
    EXPECT_NE(trace.find("expanded dst path <" + tables + ">"), std::string::npos) << trace;
    EXPECT_NE(trace.find("writing to <" + vxaenv + ".new."), std::string::npos) << trace;
    EXPECT_NE(trace.find("new KDS_RUN <KDS_RUN=KDSMAIN;KDSTRACE;KZR>"), std::string::npos);
    EXPECT_NE(trace.find("is backed up as <" + archive() + "/VXAENV_"), std::string::npos);
}

TEST_F(UpdateVxaenvTest, UnmodifiedFileKeepsItsTimeAndGetsNoBackup) {
    const struct timespec old_times[2] = {{978307200, 0}, {978307200, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, vxaenv.c_str(), old_times, 0), 0);
    zr7::trace_reconfigure("ALL");
    ::testing::internal::CaptureStdout();
    const int status = update("KDSTRACE", {"KDS_START=1"});
    const std::string trace = ::testing::internal::GetCapturedStdout();
    zr7::trace_reconfigure("ERROR");
    EXPECT_EQ(status, 0);
    EXPECT_NE(trace.find("Identical <KDS_START> <1> found.  No update."), std::string::npos);
    EXPECT_NE(trace.find("VXAENV is unmodified"), std::string::npos) << trace;
    struct stat st {};
    ASSERT_EQ(::stat(vxaenv.c_str(), &st), 0);
    EXPECT_EQ(st.st_mtim.tv_sec, 978307200);
    EXPECT_EQ(st.st_mtim.tv_nsec, 0);
    EXPECT_EQ(read_file(vxaenv), kSampleVxaenv);
    EXPECT_EQ(list_dir(tables), std::vector<std::string>{"VXAENV"});
}

TEST_F(UpdateVxaenvTest, MissingOrUnreadableFileFailsWithMinus7) {
    zr7::trace_reconfigure("ALL");
    ::testing::internal::CaptureStdout();
    ::unlink(vxaenv.c_str());
    EXPECT_EQ(update("KZR", {}), -7);
    zr7test::make_dirs(vxaenv);
    EXPECT_EQ(update("KZR", {}), -7);
    const std::string trace = ::testing::internal::GetCapturedStdout();
    zr7::trace_reconfigure("ERROR");
    EXPECT_NE(trace.find("Error: Can't open <" + vxaenv + ">"), std::string::npos) << trace;
    EXPECT_EQ(list_dir(tables), std::vector<std::string>{"VXAENV"});
    EXPECT_TRUE(list_dir(vxaenv).empty());
}

TEST_F(UpdateVxaenvTest, MissingTableDirectoryFailsWithMinus7) {
    zr7test::remove_tree(tables);
    EXPECT_EQ(update("KZR", {}), -7);
}

TEST_F(UpdateVxaenvTest, SymbolicLinkStaysAndItsTargetIsReplaced) {
    const std::string real_dir = root / "real";
    zr7test::make_dirs(real_dir);
    write_file(real_dir + "/env.real", kSampleVxaenv);
    ::unlink(vxaenv.c_str());
    ASSERT_EQ(::symlink("../../real/env.real", vxaenv.c_str()), 0);

    ASSERT_EQ(update("KZR", {}), 0);

    struct stat st {};
    ASSERT_EQ(::lstat(vxaenv.c_str(), &st), 0);
    EXPECT_TRUE(S_ISLNK(st.st_mode));
    char target[256] = {};
    ASSERT_GT(::readlink(vxaenv.c_str(), target, sizeof target - 1), 0);
    EXPECT_STREQ(target, "../../real/env.real");
    EXPECT_NE(read_file(real_dir + "/env.real").find("KDS_RUN=KDSMAIN;KDSTRACE;KZR\n"),
              std::string::npos);
    EXPECT_EQ(list_dir(real_dir), std::vector<std::string>{"env.real"});
    const std::vector<std::string> backups = list_dir(archive());
    ASSERT_EQ(backups.size(), 1u);
    EXPECT_EQ(read_file(archive() + "/" + backups[0]), kSampleVxaenv);
}

TEST_F(UpdateVxaenvTest, DanglingLinkFailsWithMinus7) {
    ::unlink(vxaenv.c_str());
    ASSERT_EQ(::symlink("nowhere", vxaenv.c_str()), 0);
    EXPECT_EQ(update("KZR", {}), -7);
}

TEST_F(UpdateVxaenvTest, ModeAndOwnerKept) {
    ASSERT_EQ(::chmod(vxaenv.c_str(), 0640), 0);
    const bool root_user = ::geteuid() == 0;
    if (root_user) {
        ASSERT_EQ(::chown(vxaenv.c_str(), 4321, 4322), 0);
    }
    ASSERT_EQ(update("KZR", {}), 0);
    struct stat st {};
    ASSERT_EQ(::stat(vxaenv.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 07777, 0640u);
    if (root_user) {
        EXPECT_EQ(st.st_uid, 4321u);
        EXPECT_EQ(st.st_gid, 4322u);
    }
}

TEST_F(UpdateVxaenvTest, TwoUpdatesInOneSecondKeepBothBackups) {
    ASSERT_EQ(update("MOD1", {}), 0);
    const std::string after_first = read_file(vxaenv);
    ASSERT_EQ(update("MOD2", {}), 0);
    const std::vector<std::string> backups = list_dir(archive());
    ASSERT_EQ(backups.size(), 2u);
    std::set<std::string> contents{read_file(archive() + "/" + backups[0]),
                                   read_file(archive() + "/" + backups[1])};
    EXPECT_EQ(contents, (std::set<std::string>{kSampleVxaenv, after_first}));
}

TEST_F(UpdateVxaenvTest, NulBytesAndLongLinesSurvive) {
    const std::string content = std::string("A=x\0y\n", 6) + std::string(3000, 'z') + "=1\n";
    write_file(vxaenv, content);
    ASSERT_EQ(update("", {"B=2"}), 0);
    EXPECT_EQ(read_file(vxaenv), content + "B=2\n");
}

TEST_F(UpdateVxaenvTest, LineBreakInARequestIsRefused) {
    EXPECT_EQ(update("A\nKDS_START=0", {}), -1);
    EXPECT_EQ(update("", {"X=a\nKDS_RUN=evil"}), -1);
    EXPECT_EQ(read_file(vxaenv), kSampleVxaenv);
    EXPECT_EQ(list_dir(tables), std::vector<std::string>{"VXAENV"});
}

TEST_F(UpdateVxaenvTest, FailedBackupLeavesFileAndNoScratch) {
    write_file(archive(), "in the way\n");
    zr7::trace_reconfigure("ALL");
    ::testing::internal::CaptureStdout();
    const int status = update("KZR", {});
    const std::string trace = ::testing::internal::GetCapturedStdout();
    zr7::trace_reconfigure("ERROR");
    EXPECT_EQ(status, -9);
    EXPECT_NE(trace.find("Error: Can't backup VXAENV"), std::string::npos) << trace;
    EXPECT_EQ(read_file(vxaenv), kSampleVxaenv);
    EXPECT_EQ(list_dir(tables), (std::vector<std::string>{".archive", "VXAENV"}));
}

TEST_F(UpdateVxaenvTest, FullDiskGivesMinus8AndLeavesTheFile) {
    const std::string big(8192, 'v');
    const int status = in_child([&] {
        const struct rlimit limit = {4096, 4096};
        ::setrlimit(RLIMIT_FSIZE, &limit);
        std::signal(SIGXFSZ, SIG_IGN);
        return update("KZR", {"BIG=" + big});
    });
    EXPECT_EQ(status, 248);  // -8
    EXPECT_EQ(read_file(vxaenv), kSampleVxaenv);
    EXPECT_EQ(list_dir(tables), std::vector<std::string>{"VXAENV"});
}

TEST_F(UpdateVxaenvTest, SixRunsAtOnceEachAddTheirModule) {
    constexpr int kRuns = 6;
    int gate[2];
    ASSERT_EQ(::pipe(gate), 0);
    std::vector<pid_t> children;
    for (int i = 0; i < kRuns; ++i) {
        std::fflush(stdout);
        const pid_t pid = ::fork();
        if (pid == 0) {
            ::close(gate[1]);
            char byte = 0;
            // Every run starts when the gate closes.
            while (::read(gate[0], &byte, 1) > 0) {
            }
            ::_exit(update("MOD" + std::to_string(i), {}) & 0xFF);
        }
        children.push_back(pid);
    }
    ::close(gate[0]);
    ::close(gate[1]);
    for (pid_t pid : children) {
        int status = 0;
        ASSERT_EQ(::waitpid(pid, &status, 0), pid);
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
    }

    const std::string final_content = read_file(vxaenv);
    for (int i = 0; i < kRuns; ++i) {
        EXPECT_NE(final_content.find("MOD" + std::to_string(i)), std::string::npos)
            << final_content;
    }

    // Each backup is one whole state: the sample with 0, 1, ... 5 modules
    // added, each count exactly once.
    const std::vector<std::string> backups = list_dir(archive());
    ASSERT_EQ(backups.size(), static_cast<std::size_t>(kRuns));
    std::multiset<long> added;
    for (const std::string& name : backups) {
        const std::string text = read_file(archive() + "/" + name);
        const std::size_t at = text.find("KDS_RUN=KDSMAIN;KDSTRACE");
        ASSERT_NE(at, std::string::npos) << text;
        const std::size_t end = text.find('\n', at);
        ASSERT_NE(end, std::string::npos);
        const std::string list = text.substr(at, end - at);
        added.insert(std::count(list.begin(), list.end(), ';') - 1);
        EXPECT_EQ(text.substr(0, at) + "KDS_RUN=KDSMAIN;KDSTRACE" + text.substr(end),
                  kSampleVxaenv);
    }
    EXPECT_EQ(added, (std::multiset<long>{0, 1, 2, 3, 4, 5}));
}

}  // namespace
