// A small JSON writer for the run record: one object on one line.
//
// File names are byte strings, JSON strings are Unicode. A string that is
// valid UTF-8 is written as it is (with the escapes JSON requires); each byte
// that is not part of a valid UTF-8 sequence is written as "\udcXX", XX its
// value (80 to ff). This is the convention of Python's "surrogateescape"
// error handler: os.fsencode() of the decoded string gives the bytes back
// exactly, and no valid UTF-8 text decodes to those code points.
#pragma once

#include <string>

#include "qsd/text/text.h"

namespace zr7 {

// The JSON string literal of a byte string, quotes included.
std::string json_string(const std::string& bytes);

// Builds one object, member after member.
class JsonObject {
  public:
    JsonObject& add(const std::string& key, const std::string& value);
    JsonObject& add(const std::string& key, const char* value);
    JsonObject& add(const std::string& key, long value);
    JsonObject& add(const std::string& key, bool value);
    JsonObject& add_null(const std::string& key);
    JsonObject& add(const std::string& key, const StringList& values);
    JsonObject& add(const std::string& key, const JsonObject& value);
    // "{...}", no line break.
    std::string text() const { return "{" + members_ + "}"; }

  private:
    JsonObject& member(const std::string& key, const std::string& json);
    std::string members_;
};

}  // namespace zr7
