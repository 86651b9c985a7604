#include "support/stdout_capture.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <stdexcept>

#include "support/test_support.h"

namespace zr7test {

std::string capture_stdout(const std::function<void()>& body) {
    TempDir scratch;
    const std::string path = scratch / "stdout";
    std::fflush(stdout);
    const int saved = ::dup(STDOUT_FILENO);
    const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    if (saved < 0 || fd < 0)
        throw std::runtime_error("cannot capture standard output");
    ::dup2(fd, STDOUT_FILENO);
    ::close(fd);
    body();
    std::fflush(stdout);
    ::dup2(saved, STDOUT_FILENO);
    ::close(saved);
    return read_file(path);
}

bool has_trace_line(const std::string& output, const std::string& message) {
    // A trace line is "(<stamp> pid <n> <unit>:<line>) <message>\n".
    return output.find(") " + message + "\n") != std::string::npos;
}

bool has_exit_event(const std::string& output, const std::string& operation, int status) {
    const std::string unit = " zr7." + operation + ":";
    const std::string event = ") Exit: " + std::to_string(status);
    std::size_t start = 0;
    while (start < output.size()) {
        std::size_t end = output.find('\n', start);
        if (end == std::string::npos)
            end = output.size();
        const std::string line = output.substr(start, end - start);
        const std::size_t at = line.find(unit);
        if (at != std::string::npos && line.size() >= event.size() &&
            line.compare(line.size() - event.size(), event.size(), event) == 0 &&
            line.find(')', at) == line.size() - event.size())
            return true;
        start = end + 1;
    }
    return false;
}

}  // namespace zr7test
