// The directory lock: other processes wait, this process never waits for
// itself.
#include "qsd/platform/directory_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/test_support.h"

namespace {

// Whether another process could take the lock right now.
bool free_for_another_process(const std::string& dir) {
    const pid_t pid = ::fork();
    if (pid == 0) {
        const int fd = ::open(dir.c_str(), O_RDONLY | O_DIRECTORY);
        ::_exit(fd >= 0 && ::flock(fd, LOCK_EX | LOCK_NB) == 0 ? 0 : 1);
    }
    int status = 0;
    ::waitpid(pid, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

TEST(DirectoryLockTest, HeldAgainstOtherProcessesAndReentrantWithinOne) {
    zr7test::TempDir dir;
    {
        zr7::DirectoryLock outer(dir.path());
        ASSERT_TRUE(outer.locked());
        EXPECT_FALSE(free_for_another_process(dir.path()));
        {
            // The same directory by another name: no self-deadlock.
            zr7::DirectoryLock inner(dir.path() + "/.");
            EXPECT_TRUE(inner.locked());
        }
        // Letting go of the inner holder keeps the outer lock.
        EXPECT_FALSE(free_for_another_process(dir.path()));
    }
    EXPECT_TRUE(free_for_another_process(dir.path()));
}

TEST(DirectoryLockTest, MissingDirectoryIsNotLocked) {
    zr7test::TempDir dir;
    zr7::DirectoryLock lock(dir / "missing");
    EXPECT_FALSE(lock.locked());
    EXPECT_NE(lock.error(), 0);
}

}  // namespace
