// What the plug-in exports is a contract with those who load it.

#include <gtest/gtest.h>

#include <algorithm>
#include <sstream>

#include "support/host/program.h"

namespace {

std::vector<std::string> definedSymbols(const std::string& library) {
    const ProgramResult nm = runProgram({"/usr/bin/nm", "-D", "--defined-only", library});
    std::vector<std::string> names;
    std::istringstream in(nm.out);
    for (std::string line; std::getline(in, line);) {
        names.push_back(line.substr(line.find_last_of(' ') + 1));
    }
    std::sort(names.begin(), names.end());
    return names;
}

TEST(Exports, AreExactlyTheDocumentedEntryPointsAndGlobals) {
    std::vector<std::string> expected = {"Initialize_Mgmt_Functions",
                                         "Initialize_Tovrin_Home",
                                         "QVS_NCS_RegisterAgentInterface",
                                         "ZAV_TOVRINHOME",
                                         "commands",
                                         "depotDir",
                                         "initialized",
                                         "queue_mutex",
                                         "taskQueue",
                                         "worktodo"};
    for (const char* name : {"zav_kagreqt", "zav_kinagt", "zav_kagdyst"}) {
        const std::string table = name;
        expected.push_back(table + "_application");
        expected.push_back(table + "_table");
        expected.push_back(table + "_static_manager");
    }
    std::sort(expected.begin(), expected.end());
    std::vector<std::string> found = definedSymbols(ZAV_BUILD_DIR "/lib/libzavmgmt.so");
    // The sanitizers give instrumented globals companions of their own.
    found.erase(
        std::remove_if(found.begin(), found.end(),
                       [](const std::string& name) { return name.rfind("__odr_asan", 0) == 0; }),
        found.end());
    EXPECT_EQ(found, expected);
}

TEST(Exports, ThePlugInNeedsOnlyThePlatformAndTheStandardLibraries) {
    const ProgramResult readelf =
        runProgram({"/usr/bin/readelf", "-d", ZAV_BUILD_DIR "/lib/libzavmgmt.so"});
    std::istringstream in(readelf.out);
    for (std::string line; std::getline(in, line);) {
        if (line.find("(NEEDED)") == std::string::npos) continue;
        bool known = false;
        for (const char* name :
             {"libzavplatform.so", "libstdc++.so", "libgcc_s.so", "libc.so", "libm.so",
              "libpthread.so", "ld-linux", "libasan.so", "libubsan.so", "libtsan.so"}) {
            known = known || line.find(name) != std::string::npos;
        }
        EXPECT_TRUE(known) << line;
    }
}

}  // namespace
