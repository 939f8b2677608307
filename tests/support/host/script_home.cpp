#include "support/host/script_home.h"

#include <sstream>

ScriptHome::ScriptHome() {
    scratch_.makeDir("home/config");
    scratch_.makeDir("home/logs");
    scratch_.makeDir("depot");
    agentScript("exit 0");
}

void ScriptHome::agentScript(const std::string& body) {
    scratch_.script("home/bin/TovrinAgent",
                    "printf '%s\\n' \"$*\" >>'" + scratch_.path("calls") + "'\n" +
                        "for word in \"$@\"; do verb=$product; product=$word; done\n" + body +
                        "\n");
}

std::string ScriptHome::products(const std::vector<std::string>& codes,
                                 const std::string& translatorBody) {
    std::string list = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";
    std::vector<std::string> all = {"ax", "lz"};
    all.insert(all.end(), codes.begin(), codes.end());
    for (const std::string& code : all) {
        list += "\"" + code + "\",\"A product\",\"li6263\",\"060100000\",\"100\"\n";
    }
    scratch_.write("home/list.txt", list);
    scratch_.script("home/bin/cinfo", "home='" + path() +
                                          "'\n"
                                          "case $1 in\n"
                                          "-d) cat \"$home/list.txt\" ;;\n"
                                          "-p) [ -e \"$home/unreported\" ] ||\n"
                                          "    printf 'Platform codes:\\nli6263 Product (%s)\\n' "
                                          "\"$2\" ;;\n"
                                          "esac\n");
    return scratch_.script("home/agtqvs6/li6263/bin/zav_xa", translatorBody + "\n");
}

std::vector<std::string> ScriptHome::agentCalls() const {
    std::vector<std::string> calls;
    std::istringstream in(scratch_.read("calls"));
    for (std::string line; std::getline(in, line);)
        calls.push_back(line);
    return calls;
}
