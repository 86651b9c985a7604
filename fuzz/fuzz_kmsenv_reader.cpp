// The server configuration reader over any bytes: it never fails, and what
// it returns holds together.
#include "fuzz_support.h"
#include "qsd/config/kmsenv_reader.h"

namespace {

void check(const zr7::KmsenvResult& r, const zr7::ServerConfig& start) {
    const zr7::ServerConfig& c = r.config;
    ZR7_FUZZ_CHECK(c.family_setting == zr7::family_setting_for(c.port, c.protocol));
    if (c.protocol == "sna")
        ZR7_FUZZ_CHECK(c.port == "135");
    // Lines are cut at their ends, so no value holds a line break.
    for (const std::string* value : {&c.server_name, &c.arch, &c.protocol, &c.port, &c.host_name})
        ZR7_FUZZ_CHECK(value->find('\n') == std::string::npos);
    if (!start.server_name.empty()) {
        // A server already named is never renamed.
        ZR7_FUZZ_CHECK(c.server_name == start.server_name);
        ZR7_FUZZ_CHECK(r.detail_lines.empty());
    } else if (c.server_name.empty()) {
        ZR7_FUZZ_CHECK(r.detail_lines.empty());
    } else {
        ZR7_FUZZ_CHECK(r.detail_lines.size() == 1);
        ZR7_FUZZ_CHECK(r.detail_lines[0] == "MSRV name <" + c.server_name + ">");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string content(reinterpret_cast<const char*>(data), size);
    const zr7::ServerConfig fresh;
    check(zr7::read_kmsenv(content, fresh), fresh);
    zr7::ServerConfig named;
    named.server_name = "SRV1";
    check(zr7::read_kmsenv(content, named), named);
    return 0;
}
