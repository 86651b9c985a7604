#include "qsd/platform/interruption.h"

#include <signal.h>

#include <cerrno>

namespace zr7 {

namespace {

constexpr int kSignals[] = {SIGINT, SIGTERM, SIGHUP};

volatile sig_atomic_t g_signal = 0;
volatile sig_atomic_t g_forward_pid = 0;

extern "C" void record_signal(int signal_number) {
    if (g_signal == 0)
        g_signal = signal_number;
}

extern "C" void forward_signal(int signal_number) {
    const int saved_errno = errno;
    const pid_t child = static_cast<pid_t>(g_forward_pid);
    if (child > 0)
        ::kill(child, signal_number);
    errno = saved_errno;
}

sigset_t interruption_set() {
    sigset_t set;
    sigemptyset(&set);
    for (int signal_number : kSignals)
        sigaddset(&set, signal_number);
    return set;
}

}  // namespace

void catch_interruptions() {
    struct sigaction action {};
    action.sa_handler = record_signal;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    for (int signal_number : kSignals)
        ::sigaction(signal_number, &action, nullptr);
}

void ignore_file_size_signal() {
    ::signal(SIGXFSZ, SIG_IGN);
}

int interruption() {
    return static_cast<int>(g_signal);
}

void reset_interruption() {
    g_signal = 0;
}

SignalForwarding::SignalForwarding() : saved_mask_(), saved_actions_() {
    static_assert(sizeof saved_actions_ / sizeof saved_actions_[0] ==
                  sizeof kSignals / sizeof kSignals[0]);
    const sigset_t set = interruption_set();
    saved_mask_ok_ = ::sigprocmask(SIG_BLOCK, &set, &saved_mask_) == 0;
}

void SignalForwarding::forward_to(pid_t child) {
    g_forward_pid = static_cast<sig_atomic_t>(child);
    struct sigaction action {};
    action.sa_handler = forward_signal;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    for (std::size_t i = 0; i < sizeof kSignals / sizeof kSignals[0]; ++i)
        ::sigaction(kSignals[i], &action, &saved_actions_[i]);
    installed_ = true;
    // A signal held since the constructor is delivered, and forwarded, here.
    if (saved_mask_ok_)
        ::sigprocmask(SIG_SETMASK, &saved_mask_, nullptr);
}

SignalForwarding::~SignalForwarding() {
    // Blocked while the old handlers go back: no signal may find a handler
    // without a child.
    const sigset_t set = interruption_set();
    ::sigprocmask(SIG_BLOCK, &set, nullptr);
    g_forward_pid = 0;
    if (installed_) {
        for (std::size_t i = 0; i < sizeof kSignals / sizeof kSignals[0]; ++i)
            ::sigaction(kSignals[i], &saved_actions_[i], nullptr);
    }
    if (saved_mask_ok_)
        ::sigprocmask(SIG_SETMASK, &saved_mask_, nullptr);
}

}  // namespace zr7
