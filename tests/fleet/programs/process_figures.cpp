#include "tests/fleet/programs/process_figures.h"

#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>

namespace fleet_programs {

ProcessFigures figuresOf(pid_t process) {
    const std::string directory = "/proc/" + std::to_string(process);
    ProcessFigures figures;
    std::ifstream status(directory + "/status");
    for (std::string line; std::getline(status, line);) {
        std::istringstream words(line);
        std::string name;
        long number = 0;
        words >> name >> number;
        if (name == "VmRSS:") figures.residentKiB = number;
        if (name == "VmHWM:") figures.peakKiB = number;
        if (name == "Threads:") figures.threads = number;
    }
    std::ifstream stat(directory + "/stat");
    std::string text;
    std::getline(stat, text);
    // The name, which may hold blanks, ends with the last parenthesis; times are the 14th and 15th.
    std::istringstream words(text.substr(text.rfind(')') + 1));
    std::string skipped;
    for (int i = 3; i < 14; ++i)
        words >> skipped;
    double user = 0;
    double system = 0;
    words >> user >> system;
    figures.processorSeconds = (user + system) / static_cast<double>(::sysconf(_SC_CLK_TCK));
    return figures;
}

}  // namespace fleet_programs
