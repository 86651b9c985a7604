// The journal of an installing run as text: one entry a line, written whole
// with one write, so that a kill leaves every line but perhaps the last one
// whole; a last line without its line break is ignored when read back.
//
//   mkdir <path>                   a directory the run is about to make
//   create <path>                  a file the run is about to create
//   replace <kept> <path>          a file about to be replaced; its old version
//                                  is <kept> in the run's directory ("-" when
//                                  none could be kept)
//   installed <digest> <path>      the bytes the run left there
//   backup <path>                  the environment file's backup the run made
//   seed <path>                    an SQL file given to the loader
//
// Paths are relative to the installation directory, escaped as the log
// escapes them (so one line each, whatever the name); digests are
// "<size>:<hash>:<hash>" in hex.
#pragma once

#include <string>
#include <vector>

#include "qsd/fileops/copy_outcome.h"

namespace zr7 {

struct JournalEntry {
    std::string kind;      // "mkdir", "create", "replace", "installed", "backup", "seed"
    std::string kept;      // for "replace"
    ContentDigest digest;  // for "installed"
    std::string path;
};

std::string journal_line(const JournalEntry& entry);

// The whole entries of a journal's text, in order. Lines that are torn or
// that no version of the tool writes are left out, and so is a path that
// climbs out of the installation ("..") or is absolute: undo only ever acts
// below the installation directory.
std::vector<JournalEntry> parse_journal(const std::string& text);

}  // namespace zr7
