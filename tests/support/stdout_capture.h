// Captures what code under test writes on standard output (the trace lines).
#pragma once

#include <functional>
#include <string>

namespace zr7test {

// Runs `body` with standard output sent to a scratch file and returns what
// was written there.
std::string capture_stdout(const std::function<void()>& body);

// True when `output` holds a trace line whose message is exactly `message`.
bool has_trace_line(const std::string& output, const std::string& message);

// True when `output` holds the exit event of `operation` (as in
// "Installer610::copy") with `status`.
bool has_exit_event(const std::string& output, const std::string& operation, int status);

}  // namespace zr7test
