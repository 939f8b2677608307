// zavfleetd: the centre of a fleet.

#include <sys/stat.h>

#include <chrono>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "fleet/server/commands/command_line.h"

int main(int argc, char** argv) {
    ::umask(0077);
    try {
        const auto now = fleet::wallClock();
        const int status = fleet::runCommandLine(std::vector<std::string>(argv + 1, argv + argc),
                                                 now, std::cout, std::cerr);
        // A line that invites somebody and could not be written is lost.
        std::cout.flush();
        return std::cout ? status : fleet::kFailed;
    } catch (const std::exception& error) {
        std::cerr << "zavfleetd: " << error.what() << '\n';
        return fleet::kFailed;
    }
}
