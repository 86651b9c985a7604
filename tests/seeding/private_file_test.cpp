// The response file's creation: nothing that stood at the path is written
// through, and a failed write is reported.
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "qsd/seeding/private_file.h"
#include "seeding/seeding_fixture.h"
#include "support/test_support.h"

namespace {

using zr7test::read_file;
using zr7test::TempDir;
using zr7test::write_file;

TEST(PrivateFile, CreatesTheFileWithMode0600) {
    TempDir tmp;
    ASSERT_EQ(zr7::create_private_file(tmp / "f", "content"), 0);
    EXPECT_EQ(read_file(tmp / "f"), "content");
    struct stat st {};
    ASSERT_EQ(::stat((tmp / "f").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 07777, 0600u);
}

TEST(PrivateFile, LinkAtThePathIsReplacedNotFollowed) {
    TempDir tmp;
    write_file(tmp / "victim", "precious", 0666);
    ASSERT_EQ(::symlink((tmp / "victim").c_str(), (tmp / "f").c_str()), 0);
    ASSERT_EQ(zr7::create_private_file(tmp / "f", "new"), 0);
    EXPECT_EQ(read_file(tmp / "victim"), "precious");
    struct stat st {};
    ASSERT_EQ(::lstat((tmp / "f").c_str(), &st), 0);
    EXPECT_TRUE(S_ISREG(st.st_mode));
    EXPECT_EQ(read_file(tmp / "f"), "new");
}

TEST(PrivateFile, DirectoryAtThePathIsAFailure) {
    TempDir tmp;
    zr7test::make_dirs(tmp / "f");
    EXPECT_EQ(zr7::create_private_file(tmp / "f", "x"), EEXIST);
}

// Runs `body` with files limited to a few bytes, so that writes fail.
template <typename Body>
void with_tiny_file_limit(Body body) {
    struct rlimit saved {};
    ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &saved), 0);
    void (*old_handler)(int) = std::signal(SIGXFSZ, SIG_IGN);
    struct rlimit tiny = saved;
    tiny.rlim_cur = 4;
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &tiny), 0);
    body();
    ::setrlimit(RLIMIT_FSIZE, &saved);
    std::signal(SIGXFSZ, old_handler);
}

TEST(PrivateFile, WriteErrorIsReported) {
    TempDir tmp;
    int result = 0;
    with_tiny_file_limit([&] { result = zr7::create_private_file(tmp / "f", "more than four"); });
    EXPECT_EQ(result, EFBIG);
}

TEST_F(SeedingTest, ResponseFileThatCannotBeWrittenGivesMinus8) {
    write_file(sqllib + "/a.sql", "SELECT 1;\n");
    int status = 0;
    with_tiny_file_limit([&] { status = installer.seed_single_file(sqllib, "a.sql"); });
    EXPECT_EQ(status, -8);
    EXPECT_FALSE(zr7test::exists(response_path()));
    EXPECT_FALSE(zr7test::exists(record + "/a.sql.rsp"));
}

}  // namespace
