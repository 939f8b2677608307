/// A home of scripts with a universal agent, whose import changes its start-up parameters.
#pragma once

#include <map>
#include <nlohmann/json.hpp>
#include <string>

#include "support/host/script_home.h"

class UniversalAgentHome : public ScriptHome {
public:
    static constexpr const char* kParameters = "home/config/.ConfigData/kumenv";
    static constexpr const char* kSavedParameters = "home/config/.ConfigData/.kumenv.saved";

    /// `more`: further lines of the start-up parameters.
    explicit UniversalAgentHome(const std::string& more = "") {
        products({"um"}, "exit 0");
        for (const char* folder : {"ua/meta", "ua/scripts", "home/tmp"})
            files().makeDir(folder);
        files().write("home/config/um.config", "KUMP_META_PATH=" + files().path("ua/meta") +
                                                   "\nKUM_WORK_PATH=" + files().path("ua/work") +
                                                   "\nKUMP_RB_PATH=" + files().path("ua/rb") +
                                                   "\nKUMA_STARTUP_DP=FILE\n");
        files().write(kParameters, "|DATAPROVIDER|FILE|\n" + more);
        files().script("home/bin/uninstall.sh", "exit 0");
        files().script("home/bin/um_console", "[ \"${4%% *}\" != getdptype ] || echo scrp\n");
        files().write("depot/good.mdl", "APPL=X\n");
    }

    /// The query that asks for an import, which adds the data provider SCRP: the agent is
    /// stopped, the parameters are rewritten, the agent is started.
    static nlohmann::json importRequest() {
        nlohmann::json where = nlohmann::json::array();
        for (const auto& [column, value] :
             std::map<std::string, std::string>{{"COMMAND", "SETCONFIG"},
                                                {"TRANSID", "import"},
                                                {"PRODUCT", "um"},
                                                {"UACONFIG", "good.mdl"},
                                                {"CONTEXT", "RESTART=Y"}}) {
            where.push_back({{"column", column}, {"op", "="}, {"value", value}});
        }
        return {{"table", "KAGREQT"}, {"where", where}};
    }
};
