// Commands that read and change the configuration of agents: config get, config set, config edit,
// ua-config.

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>

#include "ctl/client/failure.h"
#include "ctl/client/options.h"
#include "ctl/client/task_request.h"
#include "ctl/show/rows.h"
#include "ctl/verbs/commands.h"

using nlohmann::json;

namespace ctl {
namespace {

TaskRequest request(const std::string& command, const std::string& product,
                    const std::string& target) {
    TaskRequest made;
    made.command = command;
    made.product = product;
    made.targetmsn = target;
    return made;
}

json fetchConfiguration(const Options& options, const std::string& product,
                        const std::string& target) {
    return Task(options, request("GETCONFIG", product, target), "config get " + product).askNow();
}

int runGet(const Options& options, const std::string& product, const std::string& target) {
    const json row = fetchConfiguration(options, product, target);
    const bool ok = returnCodeOf(row) == 0;
    if (options.json) {
        printJson(row);
    } else if (ok) {
        const std::string text = textOf(row, "CONTEXT");
        std::fwrite(text.data(), 1, text.size(), stdout);
        if (!text.empty() && text.back() != '\n') std::printf("\n");
    } else {
        std::fprintf(stderr, "zavctl: config get %s: failed; %s\n", product.c_str(),
                     describeRow(row).c_str());
    }
    return ok ? kSuccess : kHostReportedFailure;
}

std::string readAll(std::istream& in) {
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

std::string readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw Failure(kWrongUsage, "cannot read " + path);
    try {
        return readAll(in);
    } catch (const std::ios_base::failure&) {  // a directory, for one, can be opened
        throw Failure(kWrongUsage, "cannot read " + path);
    }
}

/// A host takes SETCONFIG for the universal agent as the import of a metafile, whatever the context
/// says, and one without a metafile as done.
void warnOfUniversalAgent(const std::string& product) {
    if (product != "um" && product != "UM" && product != "Um" && product != "uM") return;
    std::fprintf(stderr,
                 "zavctl: note: the host changes nothing of the universal agent by this; "
                 "ua-config imports metafiles\n");
}

QueuedCommand setCommand(const std::string& product, const std::string& target,
                         const std::string& text) {
    if (text.empty()) throw Failure(kWrongUsage, "the configuration is empty");
    warnOfUniversalAgent(product);
    QueuedCommand command;
    command.request = request("SETCONFIG", product, target);
    command.request.context = text;
    command.title = "config set " + product;
    return command;
}

/// A file for the editor, removed again whatever happens.
class EditedFile {
public:
    explicit EditedFile(const std::string& content) {
        const char* const dir = std::getenv("TMPDIR");
        path_ = std::string(dir != nullptr && *dir != '\0' ? dir : "/tmp") + "/zavctl.XXXXXX";
        const int descriptor = ::mkstemp(path_.data());
        if (descriptor == -1) throw Failure(kWrongUsage, "cannot make a file for the editor");
        ::close(descriptor);
        std::ofstream(path_, std::ios::binary) << content;
    }
    ~EditedFile() { ::unlink(path_.c_str()); }
    EditedFile(const EditedFile&) = delete;
    EditedFile& operator=(const EditedFile&) = delete;

    std::string edit() const {
        const char* editor = std::getenv("EDITOR");
        if (editor == nullptr || *editor == '\0') editor = "vi";
        // The variable may hold a command with arguments, so a shell takes it apart.
        const std::string command = std::string(editor) + " '" + path_ + "'";
        if (std::system(command.c_str()) != 0) {
            throw Failure(kWrongUsage, std::string("the editor ") + editor + " failed");
        }
        return readFile(path_);
    }

private:
    std::string path_;
};

int runEdit(const Options& options, const std::string& product, const std::string& target) {
    const json row = fetchConfiguration(options, product, target);
    if (returnCodeOf(row) != 0) {
        std::fprintf(stderr, "zavctl: config edit %s: failed; %s\n", product.c_str(),
                     describeRow(row).c_str());
        return kHostReportedFailure;
    }
    std::string before = textOf(row, "CONTEXT");
    if (before.empty() || before.back() != '\n') before += '\n';
    const std::string after = EditedFile(before).edit();
    if (after == before) {
        if (options.json) {
            printJson({{"reply", row}, {"events", json::array()}});
        } else {
            std::printf("config edit %s: nothing changed\n", product.c_str());
        }
        return kSuccess;
    }
    return runQueued(options, setCommand(product, target, after));
}

struct ConfigArguments {
    std::string product;
    std::string target;
    std::string file;
    std::string text;
    std::string transid;
    bool noWait = false;
};

CLI::App* addConfigCommand(CLI::App& parent, const char* name, const char* help,
                           ConfigArguments& arguments) {
    CLI::App* command = parent.add_subcommand(name, help);
    command->add_option("PRODUCT", arguments.product, "Product code")->required();
    command->add_option("--target", arguments.target, "Managed system name of the instance");
    return command;
}

void addQueuedOptions(CLI::App& command, bool& noWait, std::string& transid) {
    command.add_flag("--no-wait", noWait, "Do not wait for the outcome");
    command.add_option("--transid", transid, "The transaction identifier to use");
}

std::string textToSet(const ConfigArguments& arguments) {
    if (arguments.file.empty() == arguments.text.empty()) {
        throw Failure(kWrongUsage, "config set takes --file FILE, a text, or - for standard input");
    }
    if (!arguments.file.empty()) return readFile(arguments.file);
    return arguments.text == "-" ? readAll(std::cin) : arguments.text;
}

void addConfig(CLI::App& app, const Options& options, int& status) {
    CLI::App* config = app.add_subcommand("config", "Read and change an agent's configuration");
    config->require_subcommand(1);

    auto get = std::make_shared<ConfigArguments>();
    addConfigCommand(*config, "get", "Print a configuration", *get)
        ->callback([=, &options, &status] { status = runGet(options, get->product, get->target); });

    auto set = std::make_shared<ConfigArguments>();
    CLI::App* setter = addConfigCommand(*config, "set", "Replace a configuration", *set);
    setter->add_option("--file", set->file, "File with the configuration");
    setter->add_option("TEXT", set->text, "The configuration itself, or - for standard input");
    addQueuedOptions(*setter, set->noWait, set->transid);
    setter->callback([=, &options, &status] {
        QueuedCommand command = setCommand(set->product, set->target, textToSet(*set));
        command.wait = !set->noWait;
        command.request.transid = set->transid;
        status = runQueued(options, command);
    });

    auto edit = std::make_shared<ConfigArguments>();
    addConfigCommand(*config, "edit", "Change a configuration in $EDITOR", *edit)
        ->callback(
            [=, &options, &status] { status = runEdit(options, edit->product, edit->target); });
}

struct UaArguments {
    QueuedCommand command;
    unsigned port = 0;
    bool restart = false;
    bool noWait = false;
};

std::string uaContext(const UaArguments& arguments) {
    std::string text;
    if (arguments.port != 0) text = "PORT=" + std::to_string(arguments.port);
    if (arguments.restart) text += std::string(text.empty() ? "" : ",") + "RESTART=Y";
    return text;
}

void addUaConfig(CLI::App& app, const Options& options, int& status) {
    auto arguments = std::make_shared<UaArguments>();
    CLI::App* command = app.add_subcommand(
        "ua-config", "Import a metafile and its scripts from the depot into the universal agent");
    TaskRequest& wanted = arguments->command.request;
    wanted = request("SETCONFIG", "um", "");
    command->add_option("--metafile", wanted.uaconfig, "Metafile in the depot");
    command->add_option("--scripts", wanted.uascript, "Scripts in the depot, separated by commas")
        ->type_name("A,B");
    command->add_option("--port", arguments->port, "Port of the agent's console")
        ->check(CLI::Range(1U, 65535U));
    command->add_flag("--restart", arguments->restart,
                      "Add the metafile's data provider to those that are started, which restarts\n"
                      "the agent when it is not among them yet");
    command->add_option("--target", wanted.targetmsn, "Managed system name of the instance");
    addQueuedOptions(*command, arguments->noWait, wanted.transid);
    command->callback([=, &options, &status] {
        QueuedCommand ready = arguments->command;
        ready.request.context = uaContext(*arguments);
        ready.title = "ua-config";
        ready.wait = !arguments->noWait;
        status = runQueued(options, ready);
    });
}

}  // namespace

void addConfigurationCommands(CLI::App& app, const Options& options, int& status) {
    addConfig(app, options, status);
    addUaConfig(app, options, status);
}

}  // namespace ctl
