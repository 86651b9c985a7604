// The plan's texts: its lines and summary, the diff of the environment file,
// and the JSON strings of the run record.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "qsd/text/json.h"
#include "qsd/text/plan.h"

namespace {

using zr7::Action;

TEST(Plan, LinesCountsAndSummary) {
    zr7::Plan plan;
    plan.on_action(Action::kMkdir, "/h/t/new", "");
    plan.on_action(Action::kSame, "/h/a\nb\\c", "");
    plan.on_action(Action::kVxaenv, "/h/VXAENV", "--- a/VXAENV\n+++ b/VXAENV\n");
    EXPECT_EQ(plan.text(),
              "mkdir /h/t/new\nsame /h/a\\nb\\\\c\nvxaenv /h/VXAENV\n  --- a/VXAENV\n"
              "  +++ b/VXAENV\n");
    EXPECT_EQ(plan.summary(),
              "summary: mkdir 1 create 0 replace 0 same 1 keep 0 vxaenv 1 backup 0 seed 0 "
              "pass 0 error 0");
    EXPECT_TRUE(plan.changed());
    zr7::Plan undo(zr7::PlanKind::kUndo);
    undo.on_action(Action::kConflict, "/h/x", "");
    EXPECT_EQ(undo.summary(),
              "summary: restore 0 remove 0 rmdir 0 vxaenv 0 backup 0 seeded 0 conflict 1 error 0");
    EXPECT_FALSE(undo.changed());
    // Only what changes the server makes a plan "changed".
    for (Action action : {Action::kSame, Action::kKeep, Action::kPass, Action::kBackup,
                          Action::kSeeded, Action::kError}) {
        zr7::Plan one;
        one.on_action(action, "/x", "");
        EXPECT_FALSE(one.changed()) << zr7::action_name(action);
    }
    for (Action action : {Action::kMkdir, Action::kCreate, Action::kReplace, Action::kVxaenv,
                          Action::kSeed, Action::kRestore, Action::kRemove, Action::kRmdir}) {
        zr7::Plan one;
        one.on_action(action, "/x", "");
        EXPECT_TRUE(one.changed()) << zr7::action_name(action);
        Action back = Action::kError;
        EXPECT_TRUE(zr7::action_from_name(zr7::action_name(action), back) && back == action);
    }
}

TEST(UnifiedDiff, Texts) {
    const struct {
        std::string before, after, diff;
    } cases[] = {
        {"a\n", "a\n", ""},
        {"A=1\nKDS_RUN=X\nB=2\n", "A=1\nKDS_RUN=X Y\nB=2\nK=v\n",
         "--- a/VXAENV\n+++ b/VXAENV\n@@ -1,3 +1,4 @@\n A=1\n-KDS_RUN=X\n+KDS_RUN=X Y\n "
         "B=2\n+K=v\n"},
        // Far apart changes make two hunks; a missing last line break is marked.
        {"1\n2\n3\n4\n5\n6\n7\n8\n9\n10\n", "0\n2\n3\n4\n5\n6\n7\n8\n9\n10",
         "--- a/VXAENV\n+++ b/VXAENV\n@@ -1,4 +1,4 @@\n-1\n+0\n 2\n 3\n 4\n@@ -7,4 +7,4 @@\n"
         " 7\n 8\n 9\n-10\n+10\n\\ No newline at end of file\n"},
        // Lines removed and added among repeated ones: the shortest script.
        {"a\nb\na\nb\n", "b\na\nb\nc\n",
         "--- a/VXAENV\n+++ b/VXAENV\n@@ -1,4 +1,4 @@\n-a\n b\n a\n b\n+c\n"},
        // Into an empty file, and a control byte shown escaped.
        {"", "K=\x1b[31m\n", "--- a/VXAENV\n+++ b/VXAENV\n@@ -0,0 +1 @@\n+K=\\x1b[31m\n"},
    };
    for (const auto& c : cases)
        EXPECT_EQ(zr7::unified_diff(c.before, c.after, "VXAENV"), c.diff) << c.after;
}

// The record's strings: each byte that is no part of valid UTF-8 as
// "\udcXX", valid UTF-8 as it is, JSON's escapes otherwise; decoded the way
// Python's surrogateescape does, every byte string comes back.
std::string decode(const std::string& literal) {
    std::string bytes;
    for (std::size_t i = 1; i + 1 < literal.size(); ++i) {
        if (literal[i] != '\\') {
            bytes += literal[i];
            continue;
        }
        const char kind = literal[++i];
        if (kind == 'u') {
            const unsigned long code = std::stoul(literal.substr(i + 1, 4), nullptr, 16);
            i += 4;
            EXPECT_TRUE(code < 0x80 || (code >= 0xDC80 && code <= 0xDCFF)) << literal;
            bytes += static_cast<char>(code & 0xFF);
        } else {
            bytes += kind == 'n' ? '\n' : kind == 't' ? '\t' : kind == 'r' ? '\r' : kind;
        }
    }
    return bytes;
}

TEST(JsonString, EveryByteComesBack) {
    for (int byte = 0; byte < 256; ++byte) {
        const std::string name = "a" + std::string(1, static_cast<char>(byte)) + "z";
        const std::string literal = zr7::json_string(name);
        EXPECT_EQ(decode(literal), name) << byte;
        for (unsigned char c : literal)
            EXPECT_TRUE(c >= 0x20 && c != 0x7f) << byte;  // one line, no control byte
    }
    const struct {
        std::string bytes, literal;
    } cases[] = {
        {"é€😀", "\"é€😀\""},
        {"\"\\", "\"\\\"\\\\\""},
        {"\xc3", "\"\\udcc3\""},                                   // a sequence cut short
        {"\xc0\xaf", "\"\\udcc0\\udcaf\""},                        // an overlong "/"
        {"\xed\xa0\x80", "\"\\udced\\udca0\\udc80\""},             // a surrogate
        {"\xf4\x90\x80\x80", "\"\\udcf4\\udc90\\udc80\\udc80\""},  // past the last plane
    };
    for (const auto& c : cases)
        EXPECT_EQ(zr7::json_string(c.bytes), c.literal);
    zr7::JsonObject inner;
    inner.add("n", 3L);
    zr7::JsonObject outer;
    outer.add("s", "x")
        .add("b", true)
        .add_null("z")
        .add("l", zr7::StringList{"a", "\n"})
        .add("o", inner);
    EXPECT_EQ(outer.text(),
              "{\"s\":\"x\",\"b\":true,\"z\":null,\"l\":[\"a\",\"\\n\"],\"o\":{\"n\":3}}");
}

}  // namespace
