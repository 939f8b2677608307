#include "metrics/process_figures.h"

#include <dirent.h>
#include <sys/resource.h>
#include <unistd.h>

#include <ctime>
#include <fstream>
#include <limits>
#include <memory>
#include <sstream>
#include <string>

namespace metrics {
namespace {

struct CloseDirectory {
    void operator()(DIR* directory) const { ::closedir(directory); }
};

double secondsUsed(const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

double secondsOf(clockid_t clock) {
    timespec time{};
    ::clock_gettime(clock, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

/// Seconds since the epoch at which the machine started. From clocks, because a service that sees
/// only processes in /proc has no /proc/stat; once, because two clocks never give the same twice.
double bootTime() {
    static const double time = secondsOf(CLOCK_REALTIME) - secondsOf(CLOCK_BOOTTIME);
    return time;
}

/// When this process started, in clock ticks since boot.
std::optional<double> startTicks() {
    std::ifstream in("/proc/self/stat");
    std::string text;
    std::getline(in, text);
    // The second field is the program's name, which may hold blanks and parentheses.
    const std::size_t nameEnd = text.rfind(')');
    if (nameEnd == std::string::npos) return std::nullopt;
    std::istringstream fields(text.substr(nameEnd + 1));
    constexpr int kFieldsBeforeStart = 19;
    std::string passed;
    for (int i = 0; i < kFieldsBeforeStart; ++i)
        fields >> passed;
    double ticks = 0;
    if (!(fields >> ticks)) return std::nullopt;
    return ticks;
}

std::optional<double> startTime() {
    const std::optional<double> started = startTicks();
    const long ticks = ::sysconf(_SC_CLK_TCK);
    if (!started || ticks <= 0) return std::nullopt;
    return bootTime() + *started / static_cast<double>(ticks);
}

std::optional<double> countEntries(const char* directory) {
    const std::unique_ptr<DIR, CloseDirectory> open(::opendir(directory));
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
    return figures;
}

}  // namespace metrics
