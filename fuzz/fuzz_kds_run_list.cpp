// The module-list merge over any module name and KDS_RUN line (fields cut at
// the first NUL byte: module name, line). The old list text is never
// dropped, and a second merge of the same names changes nothing.
#include "fuzz_support.h"
#include "qsd/envfile/kds_run_list.h"

namespace {

// Names that a merge can recognise afterwards: distinct, not empty, without
// white space (which the list's trimming would take off an end).
bool clean_names(const std::string& module) {
    zr7::StringList seen;
    zr7::Tokenizer pieces(module);
    for (std::string piece = pieces.next(";"); !piece.empty(); piece = pieces.next(";")) {
        for (char c : piece) {
            if (zr7::is_c_space(c))
                return false;
        }
        for (const std::string& earlier : seen) {
            if (earlier == piece)
                return false;
        }
        seen.push_back(piece);
    }
    return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> f = zr7fuzz::fields(data, size, 2);
    const std::string& module = f[0];
    const std::string& line = f[1];
    const zr7::KdsRunUpdate u = zr7::update_kds_run_line(line, module);

    ZR7_FUZZ_CHECK(u.result == 0 || u.result == 1);
    if (u.result == 0) {
        ZR7_FUZZ_CHECK(u.line == line);
        return 0;
    }
    const std::string work = zr7::rstrip_space(line);
    const std::size_t eq = work.find('=');
    ZR7_FUZZ_CHECK(eq != std::string::npos);
    const std::string kept = "KDS_RUN=" + work.substr(eq + 1);
    ZR7_FUZZ_CHECK(u.line.size() >= kept.size() + 1);
    ZR7_FUZZ_CHECK(u.line.compare(0, kept.size(), kept) == 0);
    ZR7_FUZZ_CHECK(u.line.back() == '\n');

    if (clean_names(module))
        ZR7_FUZZ_CHECK(zr7::update_kds_run_line(u.line, module).result == 0);
    return 0;
}
