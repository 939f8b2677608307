// Writes the description of a program's interface into a file: PROGRAM_description FILE

#include <cstdio>
#include <fstream>

#include "tools/description/description.h"

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: %s FILE\n", argv[0]);
        return 2;
    }
    std::ofstream out(argv[1]);
    out << description();
    out.close();
    if (out.good()) return 0;
    std::fprintf(stderr, "%s: %s cannot be written\n", argv[0], argv[1]);
    return 1;
}
