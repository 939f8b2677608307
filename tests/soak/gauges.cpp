#include "soak/gauges.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

namespace fs = std::filesystem;

namespace soak {
namespace {

long statusFigure(pid_t pid, const std::string& name) {
    std::ifstream in("/proc/" + std::to_string(pid) + "/status");
    for (std::string line; std::getline(in, line);) {
        if (line.rfind(name, 0) == 0) return std::atol(line.c_str() + name.size());
    }
    return 0;
}

std::set<std::string> filesOf(const SoakHome& home) {
    std::set<std::string> found;
    std::error_code error;
    const fs::path root = home.root();
    for (fs::recursive_directory_iterator entry(root, error), end; entry != end;
         entry.increment(error)) {
        const std::string name = entry->path().lexically_relative(root).generic_string();
        if (name == "log" || name == std::string("depot/") + SoakHome::kPushDirectory) {
            entry.disable_recursion_pending();
        } else {
            found.insert(name);
        }
    }
    return found;
}

}  // namespace

Gauges gaugesOf(pid_t host, const SoakHome& home) {
    Gauges gauges;
    std::error_code error;
    const fs::directory_iterator entries("/proc/" + std::to_string(host) + "/fd", error);
    gauges.descriptors = std::distance(begin(entries), end(entries));
    gauges.threads = statusFigure(host, "Threads:");
    gauges.children = static_cast<long>(childrenOf(host).size());
    gauges.residentKiB = statusFigure(host, "VmRSS:");
    gauges.files = filesOf(home);
    return gauges;
}

std::vector<pid_t> childrenOf(pid_t parent) {
    std::vector<pid_t> found;
    std::error_code error;
    for (fs::directory_iterator task("/proc/" + std::to_string(parent) + "/task", error), end;
         !error && task != end; task.increment(error)) {
        std::ifstream in(task->path() / "children");
        for (pid_t child = 0; in >> child;)
            found.push_back(child);
    }
    return found;
}

pid_t parentOf(pid_t process) {
    return static_cast<pid_t>(statusFigure(process, "PPid:"));
}

}  // namespace soak
