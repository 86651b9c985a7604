// The statuses a run ends with. The process's exit status is the low byte
// (-5 exits 251): scripts and the records test these, so the numbers stay.
#pragma once

namespace zr7 {

enum Status : int {
    kStatusOk = 0,
    kStatusBadPath = -1,         // a path that cannot be made, a bad name from kmsenv
    kStatusUsage = -2,           // the command line
    kStatusCopyFailed = -5,      // a copy, a loop, a link out of the image
    kStatusSeedFailed = -6,      // the loader, or a name it cannot be given
    kStatusCannotOpen = -7,      // a directory, VXAENV or an image entry cannot be opened
    kStatusCannotWrite = -8,     // a file cannot be created or written
    kStatusBackupFailed = -9,    // the backup of VXAENV
    kStatusLockTimeout = -10,    // another run held the server too long
    kStatusInterrupted = -11,    // a signal asked to stop (the run then ends with 128+N)
    kStatusNothingToUndo = -12,  // -u found no installation to take back
    kStatusUndoConflicts = -13,  // -u left files changed since the installation
};

}  // namespace zr7
