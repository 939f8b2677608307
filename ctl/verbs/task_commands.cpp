// Commands that act on agents and products: start, stop, restart, install, complete-install,
// uninstall, remove-instance.

#include <CLI/CLI.hpp>
#include <memory>

#include "ctl/client/failure.h"
#include "ctl/client/options.h"
#include "ctl/client/task_request.h"
#include "ctl/verbs/commands.h"
#include "ctl/verbs/deploy_commands.h"

namespace ctl {
namespace {

/// What the queued commands have in common on the command line.
struct QueuedArguments {
    QueuedCommand command;
    bool noWait = false;
};

void addQueuedOptions(CLI::App& command, QueuedArguments& arguments) {
    command.add_flag("--no-wait", arguments.noWait, "Do not wait for the outcome");
    command.add_option("--transid", arguments.command.request.transid,
                       "The transaction identifier to use");
}

using Arguments = std::shared_ptr<QueuedArguments>;

QueuedCommand finished(const Arguments& arguments, const std::string& title) {
    QueuedCommand command = arguments->command;
    command.title = title;
    command.wait = !arguments->noWait;
    return command;
}

struct Verb {
    const char* name;
    const char* command;
    const char* help;
};

void addStartStop(CLI::App& app, const Verb& verb, const Options& options, int& status) {
    auto arguments = std::make_shared<QueuedArguments>();
    auto instance = std::make_shared<std::string>();
    CLI::App* command = app.add_subcommand(verb.name, verb.help);
    TaskRequest& request = arguments->command.request;
    request.command = verb.command;
    command->add_option("PRODUCT", request.product, "Product code")->required();
    CLI::Option* target =
        command->add_option("--target", request.targetmsn, "Managed system name of the instance");
    command->add_option("--instance", *instance, "Name of the instance itself")->excludes(target);
    addQueuedOptions(*command, *arguments);
    const std::string name = verb.name;
    command->callback([=, &options, &status] {
        QueuedCommand ready = finished(arguments, name + " " + arguments->command.request.product);
        if (!instance->empty()) {
            // Only START has a way to name an instance outright; the others resolve a managed
            // system name.
            if (ready.request.command != "START") {
                throw Failure(kWrongUsage, name + " takes --target, not --instance");
            }
            ready.request.optional = "INSTANCE";
            ready.request.targetmsn = *instance;
        }
        status = runQueued(options, ready);
    });
}

/// The words as one command line, which the host takes apart again at the blanks outside quotes: a
/// word with blanks stays one word. Quotes that are there already are left to group what they do.
std::string joined(const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words) {
        const bool quote = words.size() > 1 && word.find(' ') != std::string::npos &&
                           word.find_first_of("\"'\\") == std::string::npos;
        if (!text.empty()) text += ' ';
        text += quote ? '"' + word + '"' : word;
    }
    return text;
}

void addInstall(CLI::App& app, const Options& options, int& status) {
    auto arguments = std::make_shared<QueuedArguments>();
    auto words = std::make_shared<std::vector<std::string>>();
    auto restart = std::make_shared<bool>(false);
    auto complete = std::make_shared<bool>(false);
    CLI::App* command = app.add_subcommand("install", "Install a product from the depot");
    TaskRequest& request = arguments->command.request;
    request.command = "INSTALL";
    command->add_option("PRODUCT", request.product, "Product code")->required();
    command->add_option("VERSION", request.version, "Version, as in the depot")->required();
    command
        ->add_option("COMMAND", *words,
                     "The install command, after --; |DEPLOYDIR|, |DEPOTDIR| and |TOVRINHOME|\n"
                     "stand for the host's directories")
        ->required();
    CLI::Option* optional =
        command->add_option("--optional", request.optional,
                            "Qualifier; any text asks for the translator's -setCMS step");
    CLI::Option* restartFlag =
        command->add_flag("--restart", *restart, "The install restarts the host's agent process")
            ->excludes(optional);
    command
        ->add_flag("--complete", *complete,
                   "With --restart: wait for the host to come back and fetch the final outcome")
        ->needs(restartFlag);
    addQueuedOptions(*command, *arguments);
    command->callback([=, &options, &status] {
        QueuedCommand ready = finished(arguments, "install " + arguments->command.request.product);
        ready.request.context = joined(*words);
        if (!*restart) {
            status = runQueued(options, ready);
            return;
        }
        ready.request.optional = "REQUIRES_RESTART";
        status = runRestartInstall(options, ready, *complete);
    });
}

void addCompleteInstall(CLI::App& app, const Options& options, int& status) {
    auto transid = std::make_shared<std::string>();
    CLI::App* command = app.add_subcommand(
        "complete-install", "Fetch the outcome of an install that restarted the host");
    command->add_option("--transid", *transid, "The transaction identifier to use");
    command->callback([=, &options, &status] { status = runCompleteInstall(options, *transid); });
}

void addUninstall(CLI::App& app, const Options& options, int& status) {
    auto arguments = std::make_shared<QueuedArguments>();
    CLI::App* command = app.add_subcommand("uninstall", "Remove a product");
    arguments->command.request.command = "UNINSTALL";
    command->add_option("PRODUCT", arguments->command.request.product, "Product code")->required();
    addQueuedOptions(*command, *arguments);
    command->callback([=, &options, &status] {
        status = runQueued(options,
                           finished(arguments, "uninstall " + arguments->command.request.product));
    });
}

void addRemoveInstance(CLI::App& app, const Options& options, int& status) {
    auto arguments = std::make_shared<QueuedArguments>();
    CLI::App* command = app.add_subcommand("remove-instance", "Remove one instance of a product");
    TaskRequest& request = arguments->command.request;
    request.command = "REMOVEINSTANCE";
    command->add_option("PRODUCT", request.product, "Product code")->required();
    command->add_option("TARGET", request.targetmsn, "Managed system name")->required();
    command->add_option("--context", request.context, "Text for the translator's standard input");
    addQueuedOptions(*command, *arguments);
    command->callback([=, &options, &status] {
        const TaskRequest& ready = arguments->command.request;
        status = runQueued(options, finished(arguments, "remove-instance " + ready.product + " " +
                                                            ready.targetmsn));
    });
}

}  // namespace

void addTaskCommands(CLI::App& app, const Options& options, int& status) {
    for (const Verb& verb :
         {Verb{"start", "START", "Start an agent"}, Verb{"stop", "STOP", "Stop an agent"},
          Verb{"restart", "RESTART", "Stop an agent and start it again"}}) {
        addStartStop(app, verb, options, status);
    }
    addInstall(app, options, status);
    addCompleteInstall(app, options, status);
    addUninstall(app, options, status);
    addRemoveInstance(app, options, status);
}

}  // namespace ctl
