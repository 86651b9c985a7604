#include "tool/drawn_support.h"

#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "tool/tool.h"

namespace zr7test {

namespace fs = std::filesystem;

Tree snapshot(const std::string& root) {
    Tree tree;
    for (const auto& e : fs::recursive_directory_iterator(root)) {
        const std::string path = e.path().string();
        if (is_run_record(path) || path.find("/.archive") != std::string::npos ||
            path.find("/logs/") != std::string::npos || ends_with(path, "/qdsload.catalog"))
            continue;
        struct stat st {};
        ::lstat(path.c_str(), &st);
        Entry entry;
        entry.kind = S_ISDIR(st.st_mode) ? "dir" : S_ISLNK(st.st_mode) ? "link" : "file";
        if (S_ISREG(st.st_mode))
            entry.bytes = read_file(path);
        if (S_ISLNK(st.st_mode))
            entry.bytes = fs::read_symlink(path).string();
        entry.mode = st.st_mode;
        entry.uid = st.st_uid;
        entry.gid = st.st_gid;
        entry.mtime_ns =
            static_cast<long long>(st.st_mtim.tv_sec) * 1000000000 + st.st_mtim.tv_nsec;
        tree[path] = entry;
    }
    return tree;
}

void draw(SampleInstall& s, std::mt19937& random, bool failing) {
    const auto pick = [&](int n) { return static_cast<int>(random() % static_cast<unsigned>(n)); };
    const std::string m = s.image + "/MSRV/", a = m + "lx8266/";
    const char* const dirs[] = {"ATTRLIB", "RKDSCATL", "TECLIB"};
    const char* const trees[] = {
        "TABLE", "TABLE_PRESERVE", "TABLE_TXT", "TABLE_PRESERVE_TXT", "lib", "bin"};
    const auto put = [](const std::string& path, const std::string& bytes, unsigned mode = 0644) {
        make_dirs(path.substr(0, path.rfind('/')));
        write_file(path, bytes, mode);
    };
    const auto content = [&] {
        std::string text;
        for (int i = pick(4); i >= 0; --i)
            text += "line " + std::to_string(pick(3)) + (pick(2) == 0 ? "\r\n" : "\n");
        return text;
    };
    for (int i = pick(4); i > 0; --i)
        put(m + dirs[pick(3)] + "/f" + std::to_string(i) + ".txt", content());
    for (int i = pick(5); i > 0; --i) {
        const char* const names[] = {"x.sql", "y_del.sql", "notes.txt", "Z.SQL", "w_DEL.Sql"};
        put(m + "SQLLIB/" + std::to_string(i) + names[pick(5)], "SELECT 1;\n");
    }
    for (int i = pick(6); i > 0; --i) {
        const std::string sub = pick(3) == 0 ? "/new" + std::to_string(pick(2)) + "/" : "/";
        put(a + trees[pick(6)] + sub + "t" + std::to_string(i), content());
    }
    if (pick(4) == 0)
        remove_tree(a + "TABLE/sub");
    // What the home holds already, for each image file: nothing, the same
    // bytes, other bytes, other bytes read-only.
    const std::string t = s.tables() + "/";
    for (const auto& e : fs::recursive_directory_iterator(m)) {
        if (!e.is_regular_file())
            continue;
        std::string relative = e.path().string().substr(m.size());
        std::string target;
        for (const char* dir : dirs) {
            if (relative.rfind(std::string(dir) + "/", 0) == 0)
                target = t + relative;
        }
        for (const char* tree : trees) {
            const std::string prefix = std::string("lx8266/") + tree + "/";
            if (relative.rfind(prefix, 0) == 0) {
                const std::string rest = relative.substr(prefix.size());
                target = (std::string(tree) == "lib" || std::string(tree) == "bin")
                             ? s.home + "/lx8266/ms/" + tree + "/" + rest
                             : t + rest;
            }
        }
        if (target.empty() || !fs::is_directory(target.substr(0, target.rfind('/'))))
            continue;
        switch (pick(4)) {
            case 1:
                write_file(target, read_file(e.path().string()));
                break;
            case 2:
                write_file(target, "older bytes\n");
                break;
            case 3:
                write_file(target, "older bytes\n", 0444);
                break;
            default:
                break;
        }
    }
    switch (failing ? pick(10) : 9) {
        case 0:  // a destination directory missing
            remove_tree(t + "RKDSCATL");
            break;
        case 1:  // an image entry that cannot be copied
            ::mkfifo((a + "TABLE/pipe").c_str(), 0644);
            break;
        default:
            break;
    }
}

}  // namespace zr7test
