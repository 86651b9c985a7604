// What the fuzz targets share: the input cut into fields, and a check that
// stops the run with the input that broke an invariant.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace zr7fuzz {

// The input as text, cut at each NUL byte into at most `count` fields; the
// last field keeps every byte after the cut before it, NUL bytes included.
inline std::vector<std::string> fields(const uint8_t* data, size_t size, size_t count) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    std::vector<std::string> out;
    std::size_t start = 0;
    while (out.size() + 1 < count) {
        const std::size_t nul = text.find('\0', start);
        if (nul == std::string::npos)
            break;
        out.push_back(text.substr(start, nul - start));
        start = nul + 1;
    }
    out.push_back(text.substr(start));
    out.resize(count);
    return out;
}

// An invariant that failed: libFuzzer keeps the input that led here.
#define ZR7_FUZZ_CHECK(condition)                                                        \
    do {                                                                                 \
        if (!(condition)) {                                                              \
            std::fprintf(stderr, "invariant broken: %s (%s:%d)\n", #condition, __FILE__, \
                         __LINE__);                                                      \
            std::abort();                                                                \
        }                                                                                \
    } while (0)

}  // namespace zr7fuzz
