// The server configuration reader: file text in, server settings out.
#include "qsd/config/kmsenv_reader.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"
#include "support/test_support.h"
#include "support/trace_lines.h"

namespace {

struct Case {
    const char* name;
    std::string text;
    // Expected members; a named server also gives one "MSRV name" line.
    std::string server, arch, protocol, port, host;
};

const std::string kSample =
    "FIELDSEP=|\n"
    "default|PORTNUMBER|9|\n"
    "SRV1|NETWORKPROTOCOL|ip.pipe|\n"
    "SRV1|IPPIPEPORTNUMBER|7000|\n"
    "SRV1|BINARCH|arch1|\n"
    "SRV2|BINARCH|arch2|\n";

const std::string kLong(600, 'a');

// clang-format off
const std::vector<Case> kCases = {
    {"sample", kSample, "SRV1", "arch1", "ip.pipe", "7000", ""},
    {"no closing separator",
     "FIELDSEP=|\ndefault|PORTNUMBER|9\nSRV1|NETWORKPROTOCOL|ip.pipe\n"
     "SRV1|IPPIPEPORTNUMBER|7000\nSRV1|BINARCH|arch1\nSRV2|BINARCH|arch2",
     "SRV1", "arch1", "ip.pipe", "7000", ""},
    {"CRLF line ends",
     "FIELDSEP=|\r\nSRV1|NETWORKPROTOCOL|ip.pipe\r\nSRV1|IPPIPEPORTNUMBER|7000\r\n"
     "SRV1|HOSTNAME|h1\r\n",
     "SRV1", "", "ip.pipe", "7000", "h1"},
    {"empty lines skipped in both phases",
     "\n\r\nFIELDSEP=|\n\nSRV1|BINARCH|a|\n\r\n\nSRV1|NETWORKPROTOCOL|sna|\n",
     "SRV1", "a", "sna", "135", ""},
    {"separator-only lines skipped",
     "FIELDSEP=|\n|||\nSRV1|BINARCH|a|\n||\nSRV1|HOSTNAME|h|\n",
     "SRV1", "a", "", "", "h"},
    {"600-byte line is one record",
     "FIELDSEP=|\nSRV1|BINARCH|" + kLong + "|\nSRV1|NETWORKPROTOCOL|sna|\n",
     "SRV1", kLong, "sna", "135", ""},
    {"records before the FIELDSEP line ignored",
     "HEAD=x\nSRV0|BINARCH|x|\nFIELDSEP=|\nSRV1|BINARCH|a|\n", "SRV1", "a", "", "", ""},
    {"blank before FIELDSEP", " FIELDSEP=|\nSRV1|BINARCH|a|\n", "", "", "", "", ""},
    {"blank after FIELDSEP", "FIELDSEP =|\nSRV1|BINARCH|a|\n", "", "", "", "", ""},
    {"FIELDSEP without =", "FIELDSEP\nSRV1|BINARCH|a|\n", "", "", "", "", ""},
    {"FIELDSEP without = then a real one",
     "FIELDSEP\r\nFIELDSEP=|\r\nSRV1|BINARCH|a|\r\n", "SRV1", "a", "", "", ""},
    {"lowercase fieldsep", "fieldsep=|\nSRV1|BINARCH|a|\n", "", "", "", "", ""},
    {"leading = before FIELDSEP", "==FIELDSEP=|\nSRV1|BINARCH|a|\n", "SRV1", "a", "", "", ""},
    {"= is a separator too", "FIELDSEP=|\nSRV1|BINARCH=arch1|\n", "SRV1", "arch1", "", "", ""},
    {"FIELDSEP= alone",
     "FIELDSEP= | ignored\nSRV1=BINARCH=a\nSRV1|HOSTNAME|h\n", "SRV1", "a", "", "", ""},
    {"several separators", "FIELDSEP=|;\n;SRV1;;BINARCH|a;\n", "SRV1", "a", "", "", ""},
    {"a later FIELDSEP line is a record",
     "FIELDSEP=|\nFIELDSEP=;\nSRV1|BINARCH|a\n", "FIELDSEP", "", "", "", ""},
    {"comment-like owner names the server",
     "FIELDSEP=|\n# note\nSRV1|BINARCH|a|\n", "# note", "", "", "", ""},
    {"default records among the server's",
     "FIELDSEP=|\nSRV1|BINARCH|a|\ndefault|BINARCH|x|\nSRV1|HOSTNAME|h|\n",
     "SRV1", "a", "", "", "h"},
    {"owner case matters",
     "FIELDSEP=|\nSRV1|BINARCH|a|\nsrv1|HOSTNAME|h|\n", "SRV1", "a", "", "", ""},
    {"missing value is empty, a later value replaces",
     "FIELDSEP=|\nSRV1|PORTNUMBER\nSRV1|BINARCH|a|\nSRV1|BINARCH|b|\n", "SRV1", "b", "", "", ""},
    {"blanks in values kept", "FIELDSEP=|\nSRV1|BINARCH| a b |\n", "SRV1", " a b ", "", "", ""},
    {"key case matters", "FIELDSEP=|\nSRV1|binarch|a|\n", "SRV1", "", "", "", ""},
    {"sna ignores PORTNUMBER",
     "FIELDSEP=|\nSRV1|PORTNUMBER|9|\nSRV1|NETWORKPROTOCOL|sna|\n",
     "SRV1", "", "sna", "135", ""},
    {"IP.PIPE is not ip.pipe",
     "FIELDSEP=|\nSRV1|PORTNUMBER|9|\nSRV1|NETWORKPROTOCOL|IP.PIPE|\n"
     "SRV1|IPPIPEPORTNUMBER|7000|\n",
     "SRV1", "", "IP.PIPE", "9", ""},
    {"ip.spipe without its port",
     "FIELDSEP=|\nSRV1|PORTNUMBER|9|\nSRV1|NETWORKPROTOCOL|ip.spipe|\n"
     "SRV1|IPPIPEPORTNUMBER|7000|\n",
     "SRV1", "", "ip.spipe", "", ""},
    {"ip.spipe with its port",
     "FIELDSEP=|\nSRV1|IPSPIPEPORTNUMBER|3660|\nSRV1|NETWORKPROTOCOL|ip.spipe|\n",
     "SRV1", "", "ip.spipe", "3660", ""},
    {"ip.pipe without its port",
     "FIELDSEP=|\nSRV1|PORTNUMBER|9|\nSRV1|NETWORKPROTOCOL|ip.pipe|\n",
     "SRV1", "", "ip.pipe", "", ""},
    {"other protocol keeps PORTNUMBER",
     "FIELDSEP=|\nSRV1|PORTNUMBER|9|\nSRV1|NETWORKPROTOCOL|ip.udp|\n",
     "SRV1", "", "ip.udp", "9", ""},
    {"no FIELDSEP line", "SRV1|BINARCH|a|\n", "", "", "", "", ""},
    {"empty file", "", "", "", "", "", ""},
};
// clang-format on

TEST(KmsenvReaderTest, MembersFamilySettingAndDetailLines) {
    for (const Case& c : kCases) {
        const zr7::KmsenvResult r = zr7::read_kmsenv(c.text, zr7::ServerConfig{});
        EXPECT_EQ(r.config.server_name, c.server) << c.name;
        EXPECT_EQ(r.config.arch, c.arch) << c.name;
        EXPECT_EQ(r.config.protocol, c.protocol) << c.name;
        EXPECT_EQ(r.config.port, c.port) << c.name;
        EXPECT_EQ(r.config.host_name, c.host) << c.name;
        EXPECT_EQ(r.config.family_setting,
                  "KDC_FAMILIES=PORT:" + c.port + " " + c.protocol + " USE:Y")
            << c.name;
        const zr7::StringList details =
            c.server.empty() ? zr7::StringList{} : zr7::StringList{"MSRV name <" + c.server + ">"};
        EXPECT_EQ(r.detail_lines, details) << c.name;
    }
}

TEST(KmsenvReaderTest, FamilySettingReadsAsTheServerExpects) {
    EXPECT_EQ(zr7::read_kmsenv(kSample, {}).config.family_setting,
              "KDC_FAMILIES=PORT:7000 ip.pipe USE:Y");
    EXPECT_EQ(zr7::read_kmsenv("", {}).config.family_setting, "KDC_FAMILIES=PORT:  USE:Y");
}

TEST(ReadConfigTest, MissingFileReturnsTheErrorNumberAndChangesNothing) {
    zr7test::TempDir home;
    zr7::trace_reconfigure("ERROR");
    Installer610 installer;
    installer.host_name = "before";
    testing::internal::CaptureStdout();
    EXPECT_EQ(installer.read_config(home.path() + "/"), 2);
    EXPECT_TRUE(zr7test::lines_end_with(testing::internal::GetCapturedStdout(),
                                        {"Error: Can't open kmsenv"}));
    EXPECT_EQ(installer.host_name, "before");
    EXPECT_EQ(installer.family_setting, "");
}

TEST(ReadConfigTest, ReadsTheFileUnderTheHomeDirectory) {
    zr7test::TempDir home;
    zr7test::make_dirs(home / "config/.ConfigData");
    zr7test::write_file(home / "config/.ConfigData/kmsenv", kSample);
    zr7::trace_reconfigure("ERROR (UNIT:zr7 ALL)");
    Installer610 installer;
    testing::internal::CaptureStdout();
    EXPECT_EQ(installer.read_config(home.path() + "/"), 0);
    EXPECT_TRUE(zr7test::lines_end_with(testing::internal::GetCapturedStdout(),
                                        {"Entry", "MSRV name <SRV1>", "Exit: 0"}));
    EXPECT_EQ(installer.server_name, "SRV1");
    EXPECT_EQ(installer.arch, "arch1");
    EXPECT_EQ(installer.port, "7000");
    EXPECT_EQ(installer.family_setting, "KDC_FAMILIES=PORT:7000 ip.pipe USE:Y");
    EXPECT_TRUE(installer.symbols.empty());
}

TEST(HostNameTest, NamesThisHost) {
    EXPECT_FALSE(InstallUtil::get_hostname().empty());
}

}  // namespace
