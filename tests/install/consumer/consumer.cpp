// Starts the plug-in on the embedded platform and names the tables that it registers.

#include <cstdio>

#include "embedded/oxa_host.h"
#include "mgmt/zavmgmt.h"
#include "platform/bss1.h"

int main(int argc, char** argv) {
    if (argc != 2) return 2;
    BSS1_PutEnv((std::string("TOVRINHOME=") + argv[1]).c_str());
    if (Initialize_Mgmt_Functions() != 0) return 1;
    for (const oxa::Table& table : oxa::tables())
        std::printf("%s\n", table.name.c_str());
    return 0;
}
