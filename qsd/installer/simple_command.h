// One install command of the fixed command list.
#pragma once

#include <string>
#include <vector>

enum CommandKind {
    kFlatCopy = 1,   // plain files of a directory, replacing, carriage returns removed
    kTreeCopy = 2,   // a whole tree, under the options "O" and "T"
    kUpdateEnv = 3,  // the environment file VXAENV in the source directory
    kSeed = 4,       // the SQL files of the source directory into the catalog
};

class SimpleCommand {
  public:
    SimpleCommand(CommandKind kind, const char* source, const char* destination,
                  const char* options);
    virtual ~SimpleCommand() = default;
    SimpleCommand(const SimpleCommand&) = default;
    SimpleCommand& operator=(const SimpleCommand&) = default;

    CommandKind kind;
    std::string source;
    std::string destination;
    std::string options;
};

using CommandList = std::vector<SimpleCommand>;

// The command list of a run, in order: the 16 copy-group commands when
// copying is on, the seed command when seeding is on.
CommandList build_command_list(bool copying, bool seeding);
