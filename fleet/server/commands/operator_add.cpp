#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/invitation_line.h"
#include "fleet/server/commands/texts.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/names.h"
#include "fleet/server/keys/trust/operators.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {
namespace {

struct AddArguments {
    std::string name;
    std::string role;
    std::string commands;
    std::string products;
    std::string selector;
    long long validDays = 365;
    std::string invitationValid = "1d";
};

OperatorGrant grantOf(const AddArguments& arguments) {
    OperatorGrant grant;
    grant.name = arguments.name;
    grant.role = roleOf(arguments.role);
    grant.commands = patternsOf(arguments.commands);
    grant.products = patternsOf(arguments.products);
    grant.valid = daysOf(arguments.validDays);
    // Who may change something on every host is told so, not found out.
    if (arguments.selector.empty() && grant.role == Role::Operator) {
        throw KeysError("name the hosts of this operator with --on; \"*\" stands for all");
    }
    if (!arguments.selector.empty()) grant.selector = arguments.selector;
    return grant;
}

int addOperator(const AddArguments& arguments, Surroundings& around) {
    const FleetDirectory directory(around.directory);
    TrustDatabase trust(directory.trustDatabase());
    const std::string token =
        Operators(trust.connection())
            .invite(grantOf(arguments), durationOf(arguments.invitationValid), around.now);
    around.out << invitationLine(directory, token) << '\n';
    return kDone;
}

}  // namespace

Action declareOperatorAdd(CLI::App& app) {
    const auto arguments = std::make_shared<AddArguments>();
    app.add_option("NAME", arguments->name, "The operator's name")->required();
    app.add_option("--role", arguments->role, "viewer, operator or admin")->required();
    app.add_option("--commands", arguments->commands,
                   "What an operator may send, such as START,STOP,CANCEL; * for any characters");
    app.add_option("--products", arguments->products, "For which products, such as ux,k*");
    app.add_option("--on", arguments->selector, "On which hosts, such as env=test");
    app.add_option("--valid", arguments->validDays, "Days until the certificate ends")
        ->capture_default_str();
    app.add_option("--invitation-valid", arguments->invitationValid, "How long the line is good")
        ->capture_default_str();
    return [arguments](Surroundings& around) { return addOperator(*arguments, around); };
}

}  // namespace fleet
