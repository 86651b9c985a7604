// The bytes of the synthetic files: the image's files from their plan, and
// the server home's own files (its configuration and its environment file).
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "bench/gen/image_plan.h"

namespace zr7bench {

// Exactly file.size bytes of the file's kind, the same for the same plan.
std::string file_content(const PlannedFile& file);

struct HomeOptions {
    std::string server = "SRV1";
    std::string arch = "lx8266";
    std::size_t env_lines = 300;  // lines of VXAENV
    std::uint64_t seed = 20261206;
};

// The server's configuration file config/.ConfigData/kmsenv.
std::string kmsenv_text(const HomeOptions& options);

// An environment file of about env_lines lines: comments, blank lines and
// settings, with one KDS_RUN line among them.
std::string vxaenv_text(const HomeOptions& options);

// The directories of a fresh server home that the installation writes into
// (relative, parents first): the table directories of the server and of
// cicatrsq, the architecture's lib and bin, and logs.
std::vector<std::string> home_dirs(const HomeOptions& options);

}  // namespace zr7bench
