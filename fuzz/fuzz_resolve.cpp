// Path template expansion over any template: a result or a refusal, never
// more; a template without "$" comes back as it is; a value is never expanded
// again.
#include "fuzz_support.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    zr7::trace_reconfigure("NONE");  // unknown symbols would fill the output
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static Installer610* installer = [] {
        auto* made = new Installer610;
        made->add_path_symbol("HOMEPATH", "/srv/home/");
        made->add_path_symbol("SRCPATH", "/image/MSRV/");
        made->add_symbol("BINARCH", "lx8266");
        made->add_symbol("QMSNAME", "SRV1");
        made->add_symbol("AGAIN", "${QMSNAME}");
        return made;
    }();
    const std::string path_template(reinterpret_cast<const char*>(data), size);
    std::string out;
    const int rc = installer->resolve(path_template, out);
    ZR7_FUZZ_CHECK(rc == 0 || rc == -1);
    if (path_template.find('$') == std::string::npos)
        ZR7_FUZZ_CHECK(rc == 0 && out == path_template);
    if (rc == 0) {
        // Each "${NAME}" of at least four bytes gives at most 12.
        ZR7_FUZZ_CHECK(out.size() <= 3 * path_template.size());
        if (path_template == "${AGAIN}")
            ZR7_FUZZ_CHECK(out == "${QMSNAME}");
    }
    std::string again;
    ZR7_FUZZ_CHECK(installer->resolve(path_template, again) == rc);
    if (rc == 0)
        ZR7_FUZZ_CHECK(again == out);
    return 0;
}
