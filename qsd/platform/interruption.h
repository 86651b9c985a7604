// Interruption by SIGINT, SIGTERM or SIGHUP.
//
// The installing run does not die in the middle of a file: its handler only
// records the signal, and the run stops at its next safe point (between
// commands, between the files of a copy), says why, and exits with 128+N.
// The first invocation, which only waits for the installing run, passes
// those signals on to it instead of dying and leaving it behind unreported.
#pragma once

#include <signal.h>
#include <sys/types.h>

#include "qsd/platform/status.h"

namespace zr7 {

// An operation that stopped because of a recorded signal returns
// kStatusInterrupted (status.h); the run turns it into 128+N.

// Installs the recording handler for SIGINT, SIGTERM and SIGHUP (the
// installing run, once, at its start). Interrupted system calls restart.
void catch_interruptions();

// Ignores SIGXFSZ (the installing run, at its start): a write beyond the
// file size limit then fails like a write to a full disk, which the run
// reports, instead of ending the run without a word. The programs the run
// starts get the default action back.
void ignore_file_size_signal();

// 0, or the number of the first of those signals that arrived since
// catch_interruptions. Cheap: call it wherever a run may stop.
int interruption();

// The exit status of a run stopped by signal `signal_number`.
inline int interrupted_status(int signal_number) {
    return 128 + signal_number;
}

// Passes SIGINT, SIGTERM and SIGHUP on to one child while the object lives.
// The constructor blocks them, so that one arriving before the child exists
// is held rather than lost; forward_to() names the child and lets them in.
// The destructor puts the earlier handlers and signal mask back.
class SignalForwarding {
  public:
    SignalForwarding();
    ~SignalForwarding();
    SignalForwarding(const SignalForwarding&) = delete;
    SignalForwarding& operator=(const SignalForwarding&) = delete;

    void forward_to(pid_t child);

  private:
    bool saved_mask_ok_ = false;  // the constructor blocked the signals
    bool installed_ = false;      // forward_to put the handler in
    sigset_t saved_mask_;
    struct sigaction saved_actions_[3];
};

// For tests: forgets a recorded signal.
void reset_interruption();

}  // namespace zr7
