// Writes manual pages: PROGRAM TEMPLATES DIRECTORY DATE

#include <cerrno>
#include <cstdio>
#include <exception>

#include "tools/manual/pages.h"

int main(int argc, char** argv) {
    try {
        if (argc == 4) {
            manual::writePages(argv[1], argv[2], argv[3]);
            return 0;
        }
        std::fprintf(stderr, "usage: %s TEMPLATES DIRECTORY DATE\n", program_invocation_short_name);
        return 2;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "%s: %s\n", program_invocation_short_name, error.what());
        return 1;
    }
}
