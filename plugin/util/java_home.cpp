// The search for a Java installation.
#include <cstdlib>
#include <string>

#include "base/zavtrace.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavutil"};

// Results of fso_test.
constexpr int kDirectory = 0;
constexpr int kNoDirectory = 1;

constexpr const char* kJavaVariables[] = {"JAVA_HOME", "JAVAHOME"};

/// The result of fso_test, without changing the path.
int kindOf(const char* path) {
    std::string copy = path;
    return Util::fso_test(copy.data());
}

/// Takes the first line that the home's own script prints; traces when it prints nothing.
void askScript(Trace& trace, const String& homeDir, String& javaHome) {
    const String script = homeDir + "/bin/TovrinGetJavaHome";
    trace().detail("JavaHome location script is [%s]", script);
    if (kindOf(script.c_str()) != kNoDirectory) {
        trace().error("The JavaHome location script [%s] was not found", script);
        return;
    }
    int rc = 0;
    String output;
    String errors;
    Util::runCommand(script, rc, output, errors, String(), false);
    if (output.length() == 0) {
        trace().error("The JavaHome script [%s] failed or returned no value", script);
        return;
    }
    Util::stripNewlineCharsFromOutput(output);
    javaHome = output;
}

/// Takes the directory that `variable` names; false when it names none.
bool askVariable(Trace& trace, const char* variable, String& javaHome) {
    const char* const value = std::getenv(variable);
    if (value == nullptr || *value == '\0') {
        trace().error(
            "Checked for a Java location in %s, but that variable is not set in the environment.",
            variable);
        return false;
    }
    if (kindOf(value) != kDirectory) {
        trace().error(
            "The %s variable is set in the environment, but does not appear to reference a valid "
            "Java location.",
            variable);
        return false;
    }
    trace().detail("Found a valid Java location in %s: \"%s\"\n", variable, value);
    javaHome = String(value);
    Util::stripNewlineCharsFromOutput(javaHome);
    return true;
}

}  // namespace

void Util::getJavaHome(const String& homeDir, String& javaHome) {
    Trace trace(traceUnit);
    askScript(trace, homeDir, javaHome);
    if (javaHome.length() != 0) return;
    for (const char* variable : kJavaVariables) {
        if (askVariable(trace, variable, javaHome)) return;
    }
}

}  // namespace ZAV
