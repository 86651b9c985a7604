// Helpers shared by the test programs: scratch directories, files, running
// the built tool, and a sample server installation with a source image.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace zr7test {

// A fresh directory under the system's scratch area, removed with its
// contents when the object goes away.
class TempDir {
  public:
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;
    const std::string& path() const { return path_; }
    std::string operator/(const std::string& relative) const { return path_ + "/" + relative; }

  private:
    std::string path_;
};

void make_dirs(const std::string& path);
void write_file(const std::string& path, const std::string& content, unsigned mode = 0644);
std::string read_file(const std::string& path);
bool exists(const std::string& path);
void remove_tree(const std::string& path);
// Names in a directory, sorted; "." and ".." left out.
std::vector<std::string> list_dir(const std::string& path);

struct RunResult {
    int exit_code = -1;  // 0..255, or 128+N for signal N
    std::string out;
    std::string err;
};

struct RunOptions {
    std::map<std::string, std::string> set_env;  // added or replaced
    std::vector<std::string> unset_env;
    std::string cwd;                  // "" = the test's own
    std::string stdin_path;           // "" = /dev/null
    bool prepend_bin_to_path = true;  // build/bin first on PATH (the stand-in loader)
    std::string argv0;                // "" = the program's path
};

// Runs a program (a path) with arguments, capturing standard output and
// standard error. The tool runs under ZR7_TOOL_WRAPPER when that is set
// (`make memcheck`: valgrind and its options).
RunResult run(const std::string& program, const std::vector<std::string>& args,
              const RunOptions& options = {});

// The built tool and its directory.
std::string tool_path();
std::string bin_dir();

// A sample server installation and source image in a scratch directory:
//   home/config/.ConfigData/kmsenv   server SRV1, architecture lx8266, ip.pipe 1918
//   home/tables/SRV1/{VXAENV,ATTRLIB,RKDSCATL,TECLIB}
//   home/tables/cicatrsq/{ATTRLIB,RKDSCATL,TECLIB,SQLLIB}
//   home/lx8266/ms/{lib,bin}, home/logs
//   image/MSRV/{ATTRLIB,RKDSCATL,TECLIB,SQLLIB} and image/MSRV/lx8266/{TABLE,...}
struct SampleInstall {
    TempDir root;
    std::string home;   // without trailing "/"
    std::string image;  // without trailing "/"
    std::string server = "SRV1";
    std::string arch = "lx8266";
    std::string vxaenv;  // path of VXAENV

    SampleInstall();
    std::string tables() const { return home + "/tables/" + server; }
    std::string cicatrsq() const { return home + "/tables/cicatrsq"; }
};

// The content SampleInstall gives VXAENV.
extern const char* const kSampleVxaenv;

}  // namespace zr7test
