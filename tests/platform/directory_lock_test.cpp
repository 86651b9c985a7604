// The directory lock: other processes wait a bounded time, this process never
// waits for itself, and root's lock lives where only root can open it.
#include "qsd/platform/directory_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <optional>
#include <tuple>

#include "support/test_support.h"

namespace {

// Whether another process gets the lock at once (a wait of 0 seconds).
bool free_for_another_process(const std::string& dir) {
    std::fflush(nullptr);
    const pid_t pid = ::fork();
    if (pid == 0) {
        ::setenv("ZR7_LOCK_WAIT", "0", 1);
        const zr7::DirectoryLock lock(dir);
        ::_exit(lock.locked() ? 0 : lock.failure() == zr7::kStatusLockTimeout ? 1 : 2);
    }
    int status = 0;
    EXPECT_EQ(::waitpid(pid, &status, 0), pid);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) <= 1) << status;
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

TEST(DirectoryLockTest, HeldAgainstOtherProcessesAndReentrantWithinOne) {
    zr7test::TempDir dir;
    std::optional<zr7::DirectoryLock> outer(std::in_place, dir.path());
    ASSERT_TRUE(outer->locked());
    {
        zr7::DirectoryLock inner(dir.path() + "/.");  // the same directory: no self-deadlock
        EXPECT_TRUE(inner.locked());
    }
    EXPECT_FALSE(free_for_another_process(dir.path()));  // the outer holder keeps it
    outer.reset();
    EXPECT_TRUE(free_for_another_process(dir.path()));
}

TEST(DirectoryLockTest, MissingDirectoryIsNotLocked) {
    zr7test::TempDir dir;
    zr7::DirectoryLock lock(dir / "missing");
    EXPECT_FALSE(lock.locked());
    EXPECT_NE(lock.error(), 0);
    EXPECT_EQ(lock.failure(), 0);  // the caller says what it could not open
}

TEST(DirectoryLockTest, WaitSettingIsWholeSecondsUpToADay) {
    const std::tuple<const char*, int> cases[] = {
        {nullptr, 600},   {"", 600},      {"0", 0},    {"1", 1},
        {"86400", 86400}, {"86401", 600}, {"-1", 600}, {"1.5", 600},
        {" 5", 600},      {"5s", 600},    {"0007", 7}, {"99999999999999999999", 600}};
    for (const auto& [setting, seconds] : cases)
        EXPECT_EQ(zr7::lock_wait_seconds(setting), seconds) << (setting ? setting : "(unset)");
}

TEST(DirectoryLockTest, LockFileNamedAfterTheDirectorysIdentity) {
    EXPECT_EQ(zr7::lock_file_name(2049, 131073), "2049-131073.lock");
    EXPECT_EQ(zr7::root_lock_directory(), "/run/zr7inst");  // this machine has /run
}

// Root's lock directory: made private when missing, refused in any shape that
// another account could use to reach or replace the lock files.
TEST(DirectoryLockTest, RootLockDirectoryOnlyWhenNobodyElseCanWriteIt) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "only root can make directories owned by another user";
    zr7test::TempDir dir;
    zr7test::make_dirs(dir / "real");
    const std::string elsewhere = dir / "real";
    // A step: "mode", "owner", "file", "link"; then whether the directory is taken.
    const std::tuple<const char*, const char*, unsigned, bool> cases[] = {
        {"missing", "", 0, true},
        {"private", "mode", 0700, true},
        {"readable", "mode", 0755, true},
        {"group_writable", "mode", 0770, false},
        {"world_writable", "mode", 01777, false},
        {"other_owner", "owner", 0700, false},
        {"a_file", "file", 0600, false},
        {"a_link", "link", 0700, false}};
    for (const auto& [name, step, mode, taken] : cases) {
        const std::string path = dir / name;
        if (std::string(step) == "mode" || std::string(step) == "owner") {
            ::mkdir(path.c_str(), 0700);
            ::chmod(path.c_str(), mode);
            if (std::string(step) == "owner") {
                EXPECT_EQ(::chown(path.c_str(), 65534, 65534), 0);
            }
        }
        if (std::string(step) == "file")
            zr7test::write_file(path, "", mode);
        if (std::string(step) == "link") {
            EXPECT_EQ(::symlink(elsewhere.c_str(), path.c_str()), 0);
        }
        const int fd = zr7::open_lock_directory(path);
        EXPECT_EQ(fd >= 0, taken) << name;
        struct stat st {};
        if (fd >= 0) {
            EXPECT_EQ(::fstat(fd, &st), 0);
            EXPECT_EQ(st.st_mode & 077 & ~0055u, 0u) << name;
            ::close(fd);
        }
    }
    struct stat made {};
    ASSERT_EQ(::stat((dir / "missing").c_str(), &made), 0);
    EXPECT_EQ(made.st_mode & 07777, 0700u);
}

}  // namespace
