#include "tasks/ua_console.h"

#include <string>
#include <vector>

#include "base/zavtrace.h"
#include "tasks/home.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// The settings for one run, in the console's order.
std::vector<std::string> settingsFor(const UaConsole& console) {
    Trace trace(traceUnit);
    std::vector<String> settings{"KUM_PRODSPEC_PATH=" + console.workPath + "/",
                                 "KUMP_RB_PATH=" + console.rbPath, "KUMP_DPCONSOLE_NOCONFIRM=Y"};
    if (console.port.length() != 0) settings.push_back("KUMP_DPCONSOLE_PORT=" + console.port);
    std::vector<std::string> narrowed;
    for (const String& setting : settings) {
        narrowed.emplace_back(static_cast<const char*>(setting.c_str()));
        trace().detail("Environment variable %d - %s", narrowed.size(), setting);
    }
    return narrowed;
}

/// A list of pointers to the texts that ends in a null pointer. Valid as long as the texts are.
std::vector<char*> pointersTo(std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    for (std::string& text : texts)
        pointers.push_back(text.data());
    pointers.push_back(nullptr);
    return pointers;
}

}  // namespace

ConsoleRun UaConsole::run(const String& verb, const String& metafile) const {
    Trace trace(traceUnit);
    const String home = ZAV_TOVRINHOME;
    ConsoleRun result;
    result.command = home + "/bin/um_console -h " + home + " -c \"" + verb + " " + metafile + "\"";
    std::vector<std::string> settings = settingsFor(*this);
    String stdErr;
    result.started = ZAV::Util::runCommandEnv(result.command, pointersTo(settings).data(),
                                              result.exitCode, result.stdOut, stdErr, "", false);
    return result;
}
