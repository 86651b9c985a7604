// Preloaded into the tool by the benchmark runner. When the process ends it
// appends one line to the file that ZR7BENCH_RUSAGE names: its own CPU time
// and peak resident memory, apart from those of the children it waited for.
// Timing the tool from outside cannot separate the two, since the installing
// invocation is the runner's grandchild and its copies are its own children.
//
// The installing invocation (the one given -o) takes the probe out of its
// environment, so the programs it starts run exactly as without the probe.
#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

const char* g_role = nullptr;

long long micros(const struct timeval& tv) {
    return static_cast<long long>(tv.tv_sec) * 1000000LL + tv.tv_usec;
}

void report() {
    const char* path = std::getenv("ZR7BENCH_RUSAGE");
    if (path == nullptr || *path == '\0' || g_role == nullptr)
        return;
    struct rusage self {};
    struct rusage children {};
    ::getrusage(RUSAGE_SELF, &self);
    ::getrusage(RUSAGE_CHILDREN, &children);
    char line[256];
    const int n = std::snprintf(
        line, sizeof line,
        "zr7bench-rusage pid=%d role=%s self_us=%lld children_us=%lld maxrss_kb=%ld "
        "children_maxrss_kb=%ld\n",
        static_cast<int>(::getpid()), g_role, micros(self.ru_utime) + micros(self.ru_stime),
        micros(children.ru_utime) + micros(children.ru_stime), self.ru_maxrss, children.ru_maxrss);
    const int fd = ::open(path, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (fd < 0)
        return;
    if (n > 0)
        (void)!::write(fd, line, static_cast<std::size_t>(n));
    ::close(fd);
}

// glibc hands the program's arguments to the functions of .init_array.
void start(int argc, char** argv, char**) {
    if (argc < 1 || argv[0] == nullptr)
        return;
    const char* slash = std::strrchr(argv[0], '/');
    if (std::strcmp(slash == nullptr ? argv[0] : slash + 1, "zr7inst") != 0)
        return;
    g_role = "launcher";
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "-o") == 0) {
            g_role = "installer";
            ::unsetenv("LD_PRELOAD");
            break;
        }
    }
    std::atexit(report);
}

__attribute__((section(".init_array"), used)) void (*const g_start)(int, char**, char**) = start;

}  // namespace
