// Times programs from their start to their end, in turns. See process_bench.sh.
//
//   process_bench [--rounds N] [--out FILE] NAME=COMMAND-LINE...
//
// A command line is split at blanks; the program must end with status 0. The medians are printed in
// microseconds; FILE takes them in seconds.

#include <CLI/CLI.hpp>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "request/turns.h"

int main(int argc, char** argv) {
    std::vector<std::string> programs;
    int rounds = 300;
    std::string out;
    CLI::App app;
    app.add_option("PROGRAM", programs)->required();
    app.add_option("--rounds", rounds)->check(CLI::PositiveNumber);
    app.add_option("--out", out);
    CLI11_PARSE(app, argc, argv);
    try {
        std::vector<request::Way> ways;
        for (const std::string& named : programs)
            ways.push_back(request::programOf(named, ""));
        request::takeTurns(ways, rounds);
        request::report(ways, "process/", out);
    } catch (const std::exception& error) {
        std::cerr << "process_bench: " << error.what() << '\n';
        return 1;
    }
    return 0;
}
