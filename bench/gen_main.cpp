// zr7bench_gen: writes a synthetic source image and a fresh server home.
//
//   zr7bench_gen [--size small|default|large | --files N] [--seed N]
//                [--deep N] [--wide N] OUT
//
// OUT/image is the source image (OUT/image/MSRV/...), OUT/home the server
// home. The summary on standard output says what an installation of the
// image does.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "bench/gen/content.h"
#include "bench/gen/image_plan.h"
#include "bench/gen/write_tree.h"

namespace {

[[noreturn]] void usage() {
    std::fprintf(stderr,
                 "usage: zr7bench_gen [--size small|default|large | --files N] [--seed N]\n"
                 "                    [--deep N] [--wide N] OUT\n");
    std::exit(2);
}

std::size_t number(const char* text) {
    char* end = nullptr;
    const unsigned long long value = std::strtoull(text, &end, 10);
    if (end == text || *end != '\0')
        usage();
    return static_cast<std::size_t>(value);
}

}  // namespace

int main(int argc, char** argv) {
    zr7bench::GenOptions options;
    std::string out;
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        const bool has_value = i + 1 < argc;
        if (arg == "--size" && has_value) {
            options.files = zr7bench::files_for_size(argv[++i]);
            if (options.files == 0)
                usage();
        } else if (arg == "--files" && has_value) {
            options.files = number(argv[++i]);
        } else if (arg == "--seed" && has_value) {
            options.seed = number(argv[++i]);
        } else if (arg == "--deep" && has_value) {
            options.deep = number(argv[++i]);
        } else if (arg == "--wide" && has_value) {
            options.wide = number(argv[++i]);
        } else if (arg.compare(0, 2, "--") == 0 || !out.empty()) {
            usage();
        } else {
            out = arg;
        }
    }
    if (out.empty())
        usage();

    const zr7bench::ImagePlan plan = zr7bench::plan_image(options);
    zr7bench::HomeOptions home;
    home.arch = options.arch;
    home.seed = options.seed;
    if (int rc = zr7bench::write_image(plan, out + "/image")) {
        std::fprintf(stderr, "zr7bench_gen: image: %s\n", std::strerror(rc));
        return 1;
    }
    if (int rc = zr7bench::write_home(home, out + "/home")) {
        std::fprintf(stderr, "zr7bench_gen: home: %s\n", std::strerror(rc));
        return 1;
    }
    const zr7bench::WorkCount work = zr7bench::count_work(plan, options.arch);
    std::uint64_t bytes = 0;
    for (const auto& file : plan.files)
        bytes += file.size;
    std::printf("image %s/image: %zu files, %zu directories, %llu bytes\n", out.c_str(),
                plan.files.size(), plan.dirs.size(), static_cast<unsigned long long>(bytes));
    std::printf("home  %s/home\n", out.c_str());
    std::printf(
        "an installation: %zu file copies (%llu bytes), %zu new directories, %zu loader runs\n",
        work.file_copies, static_cast<unsigned long long>(work.bytes), work.directories,
        work.loader_runs);
    return 0;
}
