// Writes the description of the host's interface into a file: zavdescribe FILE

#include <cstdio>
#include <fstream>

#include "host/api/routes.h"
#include "routes/description/description.h"

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fputs("usage: zavdescribe FILE\n", stderr);
        return 2;
    }
    std::ofstream out(argv[1]);
    out << host::describe(host::routes());
    out.close();
    if (out.good()) return 0;
    std::fprintf(stderr, "zavdescribe: %s cannot be written\n", argv[1]);
    return 1;
}
