// Writing the planned image and a fresh server home to disk, and removing a
// tree again. Each returns 0 or the errno of the first failure.
#pragma once

#include <string>

#include "bench/gen/content.h"
#include "bench/gen/image_plan.h"

namespace zr7bench {

// Creates `path` and any missing parents (mode 0755).
int make_dirs(const std::string& path);
int write_file(const std::string& path, const std::string& content, unsigned mode);

// The image under `root` (which is created): root/MSRV/...
int write_image(const ImagePlan& plan, const std::string& root);

// A fresh server home under `root`: configuration, VXAENV and the empty
// directories the installation writes into.
int write_home(const HomeOptions& options, const std::string& root);

// Removes a tree without following symbolic links; a missing path is no error.
int remove_tree(const std::string& path);

}  // namespace zr7bench
