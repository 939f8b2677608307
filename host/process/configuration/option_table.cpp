#include "host/process/configuration/option_table.h"

#include <algorithm>

namespace host {

const std::vector<OptionRow>& optionTable() {
    constexpr OptionKind kText = OptionKind::Text;
    constexpr OptionKind kNumber = OptionKind::Number;
    constexpr OptionKind kFlag = OptionKind::Flag;
    static const std::vector<OptionRow> rows = {
        {"home", kText, "DIR", "The home directory; else TOVRINHOME names it"},
        {"config", kText, "FILE",
         "A file with more of these options, see zavhost.conf(5); the command line "
         "overrides it",
         OptionPlace::CommandLineOnly},
        {"socket", kText, "PATH",
         "The socket for HTTP; else ZAV_SOCKET, XDG_RUNTIME_DIR/zavhost.sock or /run/zavhost.sock"},
        {"rpc-socket", kText, "PATH",
         "The socket for file transfers; else the other's name with .rpc appended"},
        {"rpc-port", kNumber, "N",
         "A TCP port, 1 to 65535, that takes file transfers from this machine as well"},
        {"group", kText, "NAME",
         "Serve the members of this group, too; they may do everything, as root may"},
        {"read-only-group", kText, "NAME",
         "Serve the members of this group, too; they may look, but change nothing"},
        {"origin-node", kText, "NAME",
         "The name of the node that this host stands for; else the machine's"},
        {"plugin", kText, "FILE",
         "The plug-in; else libzavmgmt.so in ../lib beside this program or where the loader looks"},
        {"state", kText, "DIR",
         "The directory for what the host itself keeps; else STATE_DIRECTORY or HOME/zavhost"},
        {"no-journal", kFlag, nullptr, "Keep tasks in memory only; they end with the process"},
        {"max-queued", kNumber, "N", "How many tasks may wait, 1 to 1000000; 1000 if not given"},
        {"keep-tasks", kNumber, "DAYS",
         "How many days tasks that are over are kept, 1 to 36500; 30 if not given"},
        {"keep-rows", kNumber, "N",
         "How many rows of outcomes are kept, 1 to 100000000; 10000 if not given"},
        {"orphan-wait", kNumber, "SECONDS",
         "How long the host waits for commands of an earlier run before it kills them, 1 to 86400; "
         "as long as a command may run if not given"},
        {"on-interrupt", kText, "keep|rerun",
         "What becomes of a task in whose midst the host was killed: keep notes that, rerun runs "
         "it again; keep if not given"},
        {"task-timeout", kNumber, "SECONDS",
         "How long one command of a task may run; else TIMEOUT says so, else 300"},
        {"grace", kNumber, "SECONDS",
         "How long the task in hand may take when the host is told to end, 1 to 86400; 10 if not "
         "given"},
        {"max-output", kNumber, "BYTES",
         "How much the commands of one task may write before they are ended, 1 to 1000000000; "
         "16777216 if not given"},
        {"log-format", kText, "text|json",
         "What the host says once it serves: text is a line with time and level, or an entry with "
         "fields where the system's journal reads; json is a line that is an object; text if not "
         "given"},
        {"log-size", kNumber, "BYTES",
         "How long the trace log gets before a new one is begun, 4096 to 1000000000; 10485760 if "
         "not given"},
        {"trace-secrets", kFlag, nullptr,
         "Show passwords and configurations in the trace log as they are"},
        {"check", kFlag, nullptr,
         "Check the home and the machine, print what was found, and end; the status is 1 if the "
         "host would refuse to start",
         OptionPlace::CommandLineOnly},
        {"print-config", kFlag, nullptr,
         "Print what holds and where it comes from, as a configuration file, and end",
         OptionPlace::CommandLineOnly},
        {"unguarded", kFlag, nullptr,
         "Switch off every guard, so that the plug-in does exactly what it is told"},
    };
    return rows;
}

const OptionRow* findOption(const std::string& name) {
    const std::vector<OptionRow>& rows = optionTable();
    const auto found = std::find_if(rows.begin(), rows.end(),
                                    [&](const OptionRow& row) { return name == row.name; });
    return found == rows.end() ? nullptr : &*found;
}

}  // namespace host
