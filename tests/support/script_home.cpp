#include "support/script_home.h"

#include <sstream>

ScriptHome::ScriptHome() {
    scratch_.makeDir("home/config");
    scratch_.makeDir("home/logs");
    agentScript("exit 0");
}

void ScriptHome::agentScript(const std::string& body) {
    scratch_.script("home/bin/TovrinAgent",
                    "printf '%s\\n' \"$*\" >>'" + scratch_.path("calls") + "'\n" +
                        "for word in \"$@\"; do verb=$product; product=$word; done\n" + body +
                        "\n");
}

std::vector<std::string> ScriptHome::agentCalls() const {
    std::vector<std::string> calls;
    std::istringstream in(scratch_.read("calls"));
    for (std::string line; std::getline(in, line);)
        calls.push_back(line);
    return calls;
}
