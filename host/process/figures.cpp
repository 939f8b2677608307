#include "host/process/figures.h"

#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <limits>
#include <string>
#include <vector>

#include "host/process/children/process_table.h"
#include "host/process/system/directory_stream.h"

namespace host {
namespace {

double secondsUsed(const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

/// Seconds since the epoch at which the machine started.
std::optional<double> bootTime() {
    std::ifstream in("/proc/stat");
    for (std::string line; std::getline(in, line);) {
        if (line.rfind("btime ", 0) == 0) return std::stod(line.substr(6));
    }
    return std::nullopt;
}

std::optional<double> startTime() {
    const std::optional<ProcessEntry> self = readProcess(::getpid());
    const std::optional<double> boot = bootTime();
    const long ticks = ::sysconf(_SC_CLK_TCK);
    if (!self || !boot || ticks <= 0) return std::nullopt;
    return *boot + static_cast<double>(self->start) / static_cast<double>(ticks);
}

std::optional<double> countEntries(const char* directory) {
    const DirectoryStream open(::opendir(directory));
    if (!open) return std::nullopt;
    double count = 0;
    while (const dirent* const entry = ::readdir(open.get())) {
        if (entry->d_name[0] != '.') ++count;
    }
    return count;
}

void readMemory(ProcessFigures& figures) {
    std::ifstream in("/proc/self/statm");
    double pages = 0;
    double residentPages = 0;
    if (!(in >> pages >> residentPages)) return;
    const auto pageBytes = static_cast<double>(::sysconf(_SC_PAGESIZE));
    figures.virtualBytes = pages * pageBytes;
    figures.residentBytes = residentPages * pageBytes;
}

void readDescriptors(ProcessFigures& figures) {
    figures.openDescriptors = countEntries("/proc/self/fd");
    // The one that reads them is open meanwhile.
    if (figures.openDescriptors) --*figures.openDescriptors;
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
    figures.mostDescriptors = limit.rlim_cur == RLIM_INFINITY
                                  ? std::numeric_limits<double>::infinity()
                                  : static_cast<double>(limit.rlim_cur);
}

double livingChildren() {
    const pid_t self = ::getpid();
    const std::vector<ProcessEntry> processes = readProcesses();
    return static_cast<double>(std::count_if(
        processes.begin(), processes.end(),
        [self](const ProcessEntry& process) { return process.parent == self && process.isAlive; }));
}

}  // namespace

ProcessFigures readProcessFigures() {
    ProcessFigures figures;
    rusage used{};
    if (::getrusage(RUSAGE_SELF, &used) == 0) {
        figures.cpuSeconds = secondsUsed(used.ru_utime) + secondsUsed(used.ru_stime);
    }
    figures.startSeconds = startTime();
    readMemory(figures);
    readDescriptors(figures);
    figures.threads = countEntries("/proc/self/task");
    figures.children = livingChildren();
    return figures;
}

}  // namespace host
