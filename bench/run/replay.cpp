#include "bench/run/replay.h"

#include <sstream>

namespace zr7bench {

namespace {

void replace_all(std::string& text, const std::string& name, const std::string& value) {
    for (std::size_t at = text.find(name); at != std::string::npos;
         at = text.find(name, at + value.size()))
        text.replace(at, name.size(), value);
}

// One "/" where the names meet: the tool joins "${HOMEPATH}/..." to a home
// that may end in "/", and its plan may show either.
std::string squeeze_slashes(const std::string& path) {
    std::string out;
    for (char c : path) {
        if (c != '/' || out.empty() || out.back() != '/')
            out += c;
    }
    if (out.size() > 1 && out.back() == '/')
        out.pop_back();
    return out;
}

std::string expand(std::string text, const RouteSetting& setting) {
    replace_all(text, "${SRCPATH}", setting.msrv);
    replace_all(text, "${HOMEPATH}", setting.home);
    replace_all(text, "${BINARCH}", setting.arch);
    replace_all(text, "${QMSNAME}", setting.server);
    return squeeze_slashes(text);
}

// The route at or after `first` that wrote `path`; routes.size() when none.
std::size_t find_route(const std::vector<CopyRoute>& routes, std::size_t first,
                       const std::set<std::string>& written_by_first, const std::string& path,
                       const std::set<std::string>& sources, std::string& source) {
    for (std::size_t k = first; k < routes.size(); ++k) {
        const CopyRoute& route = routes[k];
        const std::string prefix = route.to + "/";
        if (path.compare(0, prefix.size(), prefix) != 0)
            continue;
        const std::string rest = path.substr(prefix.size());
        if (route.flat && rest.find('/') != std::string::npos)
            continue;
        if (k == first && written_by_first.count(path) != 0)
            continue;
        if (sources.count(route.from + "/" + rest) != 0) {
            source = route.from + "/" + rest;
            return k;
        }
    }
    return routes.size();
}

}  // namespace

std::vector<CopyRoute> copy_routes(const CommandList& commands, const RouteSetting& setting) {
    std::vector<CopyRoute> routes;
    for (const SimpleCommand& command : commands) {
        if (command.kind != kFlatCopy && command.kind != kTreeCopy)
            continue;
        CopyRoute route;
        route.from = expand(command.source, setting);
        route.to = expand(command.destination, setting);
        route.flat = command.kind == kFlatCopy;
        route.strip_cr = route.flat || command.options.find('T') != std::string::npos;
        routes.push_back(route);
    }
    return routes;
}

ReplayList build_replay(const std::string& plan_text, const std::vector<CopyRoute>& routes,
                        const std::set<std::string>& sources) {
    ReplayList list;
    std::size_t current = 0;
    std::set<std::string> written_by_current;
    std::istringstream in(plan_text);
    for (std::string line; std::getline(in, line);) {
        const std::size_t space = line.find(' ');
        if (line.empty() || line[0] == ' ' || space == std::string::npos)
            continue;  // the environment file's diff, or an empty line
        const std::string action = line.substr(0, space);
        const std::string path = squeeze_slashes(line.substr(space + 1));
        const bool copy =
            action == "create" || action == "replace" || action == "same" || action == "keep";
        if (action == "error") {
            list.error = "the plan ends in an error: " + line;
            break;
        }
        if (!copy && action != "mkdir" && action != "seed")
            continue;
        if (path.find('\\') != std::string::npos) {
            list.error = "an escaped name is not replayed: " + line;
            break;
        }
        if (action == "mkdir") {
            list.steps.push_back({StepKind::kMkdir, "", path});
        } else if (action == "seed") {
            list.steps.push_back({StepKind::kLoad, "", path});
        } else {
            std::string source;
            const std::size_t route =
                find_route(routes, current, written_by_current, path, sources, source);
            if (route == routes.size()) {
                list.error = "no copy of the command list writes " + path;
                break;
            }
            if (route != current) {
                current = route;
                written_by_current.clear();
            }
            written_by_current.insert(path);
            if (action != "keep")
                list.steps.push_back(
                    {routes[route].strip_cr ? StepKind::kStripCr : StepKind::kCopy, source, path});
        }
    }
    if (!list.error.empty())
        list.steps.clear();
    return list;
}

}  // namespace zr7bench
