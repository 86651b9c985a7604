// The directory lock: other processes wait, this process never waits for itself.
#include "qsd/platform/directory_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <optional>

#include "support/test_support.h"

namespace {

bool free_for_another_process(const std::string& dir) {
    const pid_t pid = ::fork();
    if (pid == 0)
        ::_exit(::flock(::open(dir.c_str(), O_RDONLY), LOCK_EX | LOCK_NB) == 0 ? 0 : 1);
    int status = 0;
    return ::waitpid(pid, &status, 0) == pid && WIFEXITED(status) && WEXITSTATUS(status) == 0;
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
}

}  // namespace
