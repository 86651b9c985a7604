// The server configuration reader: file text in, server settings out.
#include "qsd/config/kmsenv_reader.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"
#include "support/test_support.h"

namespace {

struct Case {
    std::string text;
    // Expected members; a named server also gives one "MSRV name" line.
    std::string server, arch, protocol, port, host;
};

const std::string kLong(600, 'a');

// clang-format off
const std::vector<Case> kCases = {
    {"FIELDSEP=|\ndefault|PORTNUMBER|9|\nSRV1|NETWORKPROTOCOL|ip.pipe|\nSRV1|BINARCH|arch1|\n"
     "SRV1|IPPIPEPORTNUMBER|7000|\nSRV2|BINARCH|arch2|\n", "SRV1", "arch1", "ip.pipe", "7000", ""},
    // CRLF line ends, no closing separator, no final newline.
    {"FIELDSEP=|\r\nSRV1|NETWORKPROTOCOL|ip.pipe\r\nSRV1|IPPIPEPORTNUMBER|7000\r\nSRV1|HOSTNAME|h1",
     "SRV1", "", "ip.pipe", "7000", "h1"},
    {"\n\r\nFIELDSEP=|\n\nSRV1|BINARCH|a|\n\r\n\nSRV1|NETWORKPROTOCOL|sna|\n",
     "SRV1", "a", "sna", "135", ""},
    {"FIELDSEP=|\n|||\nSRV1|BINARCH|a|\n||\nSRV1|HOSTNAME|h|\n", "SRV1", "a", "", "", "h"},
    {"FIELDSEP=|\nSRV1|BINARCH|" + kLong + "|\nSRV1|HOSTNAME|h|\n", "SRV1", kLong, "", "", "h"},
    {"HEAD=x\nSRV0|BINARCH|x|\nFIELDSEP=|\nSRV1|BINARCH|a|\n", "SRV1", "a", "", "", ""},
    // Not FIELDSEP lines.
    {" FIELDSEP=|\nFIELDSEP =|\nfieldsep=|\nSRV1|BINARCH|a|\n", "", "", "", "", ""},
    {"FIELDSEP\r\nFIELDSEP=|\r\nSRV1|BINARCH|a|\r\n", "SRV1", "a", "", "", ""},
    {"==FIELDSEP=|\nSRV1|BINARCH=a|\n", "SRV1", "a", "", "", ""},
    {"FIELDSEP= | ignored\nSRV1=BINARCH=a\nSRV1|HOSTNAME|h\n", "SRV1", "a", "", "", ""},
    {"FIELDSEP=|;\n;SRV1;;BINARCH|a;\n", "SRV1", "a", "", "", ""},
    {"FIELDSEP=|\nFIELDSEP=;\nSRV1|BINARCH|a\n", "FIELDSEP", "", "", "", ""},
    {"FIELDSEP=|\n# note\nSRV1|BINARCH|a|\n", "# note", "", "", "", ""},
    {"FIELDSEP=|\nSRV1|BINARCH|a|\ndefault|BINARCH|x|\nSRV1|HOSTNAME|h|\nsrv1|HOSTNAME|g|\n",
     "SRV1", "a", "", "", "h"},
    {"FIELDSEP=|\nSRV1|PORTNUMBER\nSRV1|BINARCH|a|\nSRV1|BINARCH| b |\nSRV1|binarch|c|\n",
     "SRV1", " b ", "", "", ""},
    {"FIELDSEP=|\nSRV1|PORTNUMBER|9|\nSRV1|NETWORKPROTOCOL|IP.PIPE|\nSRV1|IPPIPEPORTNUMBER|70|\n",
     "SRV1", "", "IP.PIPE", "9", ""},
    {"FIELDSEP=|\nS1|PORTNUMBER|9|\nS1|NETWORKPROTOCOL|ip.pipe|\n", "S1", "", "ip.pipe", "", ""},
    {"FIELDSEP=|\nSRV1|IPSPIPEPORTNUMBER|3660|\nSRV1|NETWORKPROTOCOL|ip.spipe|\n",
     "SRV1", "", "ip.spipe", "3660", ""},
    {"", "", "", "", "", ""},
};
// clang-format on

TEST(KmsenvReaderTest, MembersFamilySettingAndDetailLines) {
    for (const Case& c : kCases) {
        const zr7::KmsenvResult r = zr7::read_kmsenv(c.text, zr7::ServerConfig{});
        EXPECT_EQ(r.config.server_name, c.server) << c.text;
        EXPECT_EQ(r.config.arch, c.arch) << c.text;
        EXPECT_EQ(r.config.protocol, c.protocol) << c.text;
        EXPECT_EQ(r.config.port, c.port) << c.text;
        EXPECT_EQ(r.config.host_name, c.host) << c.text;
        EXPECT_EQ(r.config.family_setting,
                  "KDC_FAMILIES=PORT:" + c.port + " " + c.protocol + " USE:Y")
            << c.text;
        const zr7::StringList details =
            c.server.empty() ? zr7::StringList{} : zr7::StringList{"MSRV name <" + c.server + ">"};
        EXPECT_EQ(r.detail_lines, details) << c.text;
    }
}

}  // namespace
