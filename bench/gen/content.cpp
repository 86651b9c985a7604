#include "bench/gen/content.h"

#include <cstdio>

namespace zr7bench {

namespace {

const char* const kWords[] = {"attribute", "table",  "catalog", "event",  "severity",
                              "node",      "status", "value",   "metric", "threshold",
                              "agent",     "class",  "slot",    "enum",   "default"};
constexpr std::size_t kWordCount = sizeof kWords / sizeof kWords[0];

std::string text_lines(Rng& rng, std::uint64_t size, const char* line_end) {
    std::string out;
    out.reserve(size + 128);
    while (out.size() < size) {
        const std::uint64_t words = 2 + rng.below(9);
        for (std::uint64_t w = 0; w < words; ++w) {
            if (w > 0)
                out += ' ';
            out += kWords[rng.below(kWordCount)];
        }
        out += line_end;
    }
    out.resize(size);
    return out;
}

std::string sql_lines(Rng& rng, std::uint64_t size) {
    std::string out;
    out.reserve(size + 128);
    char line[160];
    for (unsigned n = 1; out.size() < size; ++n) {
        std::snprintf(line, sizeof line, "INSERT INTO KZRTAB VALUES (%u, '%s', '%s');\n", n,
                      kWords[rng.below(kWordCount)], kWords[rng.below(kWordCount)]);
        out += line;
    }
    out.resize(size);
    return out;
}

std::string binary_bytes(Rng& rng, std::uint64_t size) {
    std::string out(size, '\0');
    for (std::uint64_t i = 0; i < size; i += 8) {
        std::uint64_t value = rng.next();
        for (std::uint64_t b = i; b < i + 8 && b < size; ++b) {
            out[b] = static_cast<char>(value & 0xff);
            value >>= 8;
        }
    }
    return out;
}

}  // namespace

std::string file_content(const PlannedFile& file) {
    Rng rng(file.content_seed);
    switch (file.content) {
        case Content::kTextCrlf:
            return text_lines(rng, file.size, "\r\n");
        case Content::kBinary:
            return binary_bytes(rng, file.size);
        case Content::kSql:
            return sql_lines(rng, file.size);
        case Content::kText:
        default:
            return text_lines(rng, file.size, "\n");
    }
}

std::string kmsenv_text(const HomeOptions& options) {
    const std::string& s = options.server;
    return "HEADING=benchmark server configuration\n"
           "FIELDSEP=|\n"
           "default|PORTNUMBER|1234|\n" +
           s + "|NETWORKPROTOCOL|ip.pipe|\n" + s + "|IPPIPEPORTNUMBER|1918|\n" + s + "|BINARCH|" +
           options.arch + "|\n" + s + "|HOSTNAME|benchhost|\n";
}

std::string vxaenv_text(const HomeOptions& options) {
    Rng rng(options.seed ^ 0x5645ULL);
    std::string out = "# server environment\n";
    const std::size_t kds_run_at = options.env_lines / 2;
    char line[160];
    for (std::size_t i = 1; i < options.env_lines; ++i) {
        if (i == kds_run_at) {
            out += "KDS_RUN=KDSMAIN;KDSTRACE;KDSAUDIT\n";
        } else if (i % 17 == 0) {
            out += "\n";
        } else if (i % 11 == 0) {
            std::snprintf(line, sizeof line, "# %s %s\n", kWords[rng.below(kWordCount)],
                          kWords[rng.below(kWordCount)]);
            out += line;
        } else {
            std::snprintf(line, sizeof line, "KBS_%s_%04zu=%s:%llu\n",
                          kWords[rng.below(kWordCount)], i, kWords[rng.below(kWordCount)],
                          static_cast<unsigned long long>(rng.below(100000)));
            out += line;
        }
    }
    return out;
}

std::vector<std::string> home_dirs(const HomeOptions& options) {
    const std::string tables = "tables/" + options.server;
    return {"config",
            "config/.ConfigData",
            "tables",
            tables,
            tables + "/ATTRLIB",
            tables + "/RKDSCATL",
            tables + "/TECLIB",
            "tables/cicatrsq",
            "tables/cicatrsq/ATTRLIB",
            "tables/cicatrsq/RKDSCATL",
            "tables/cicatrsq/TECLIB",
            "tables/cicatrsq/SQLLIB",
            options.arch,
            options.arch + "/ms",
            options.arch + "/ms/lib",
            options.arch + "/ms/bin",
            "logs"};
}

}  // namespace zr7bench
