#include "qsd/installer/simple_command.h"

SimpleCommand::SimpleCommand(CommandKind kind_, const char* source_, const char* destination_,
                             const char* options_)
    : kind(kind_) {
    if (source_ != nullptr)
        source = source_;
    if (destination_ != nullptr)
        destination = destination_;
    if (options_ != nullptr)
        options = options_;
}

namespace {

struct CommandRow {
    CommandKind kind;
    const char* source;
    const char* destination;
    const char* options;
};

// The copy group, in the order the installation needs: the catalog
// directories, the table, lib and bin trees, the environment file after every
// tree and before the two TECLIB copies out of the TABLE tree.
const CommandRow kCopyGroup[] = {
    {kFlatCopy, "${SRCPATH}/ATTRLIB", "${HOMEPATH}/tables/${QMSNAME}/ATTRLIB", ""},
    {kFlatCopy, "${SRCPATH}/RKDSCATL", "${HOMEPATH}/tables/${QMSNAME}/RKDSCATL", ""},
    {kFlatCopy, "${SRCPATH}/TECLIB", "${HOMEPATH}/tables/${QMSNAME}/TECLIB", ""},
    {kFlatCopy, "${SRCPATH}/ATTRLIB", "${HOMEPATH}/tables/cicatrsq/ATTRLIB", ""},
    {kFlatCopy, "${SRCPATH}/RKDSCATL", "${HOMEPATH}/tables/cicatrsq/RKDSCATL", ""},
    {kFlatCopy, "${SRCPATH}/TECLIB", "${HOMEPATH}/tables/cicatrsq/TECLIB", ""},
    {kFlatCopy, "${SRCPATH}/SQLLIB", "${HOMEPATH}/tables/cicatrsq/SQLLIB", ""},
    {kTreeCopy, "${SRCPATH}/${BINARCH}/TABLE", "${HOMEPATH}/tables/${QMSNAME}", "O"},
    {kTreeCopy, "${SRCPATH}/${BINARCH}/TABLE_PRESERVE", "${HOMEPATH}/tables/${QMSNAME}", ""},
    {kTreeCopy, "${SRCPATH}/${BINARCH}/lib", "${HOMEPATH}/${BINARCH}/ms/lib", "O"},
    {kTreeCopy, "${SRCPATH}/${BINARCH}/bin", "${HOMEPATH}/${BINARCH}/ms/bin", "O"},
    {kTreeCopy, "${SRCPATH}/${BINARCH}/TABLE_TXT", "${HOMEPATH}/tables/${QMSNAME}", "OT"},
    {kTreeCopy, "${SRCPATH}/${BINARCH}/TABLE_PRESERVE_TXT", "${HOMEPATH}/tables/${QMSNAME}", "T"},
    {kUpdateEnv, "${HOMEPATH}/tables/${QMSNAME}", "", ""},
    {kFlatCopy, "${SRCPATH}/${BINARCH}/TABLE/TECLIB", "${HOMEPATH}/tables/${QMSNAME}/TECLIB", ""},
    {kFlatCopy, "${SRCPATH}/${BINARCH}/TABLE/TECLIB", "${HOMEPATH}/tables/cicatrsq/TECLIB", ""},
};

const CommandRow kSeedCommand = {kSeed, "${SRCPATH}/SQLLIB", "${HOMEPATH}/tables/cicatrsq/SQLLIB",
                                 ""};

}  // namespace

CommandList build_command_list(bool copying, bool seeding) {
    CommandList list;
    if (copying) {
        for (const CommandRow& row : kCopyGroup) {
            list.emplace_back(row.kind, row.source, row.destination, row.options);
        }
    }
    if (seeding) {
        list.emplace_back(kSeedCommand.kind, kSeedCommand.source, kSeedCommand.destination,
                          kSeedCommand.options);
    }
    return list;
}
