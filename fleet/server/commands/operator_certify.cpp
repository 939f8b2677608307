#include <CLI/CLI.hpp>
#include <algorithm>
#include <memory>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/operator_text.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/directory/root_file.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/setup/rotate_keys.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {
namespace {

struct CertifyArguments {
    std::string root;
    std::vector<std::string> keys;
    bool isAll = false;
};

/// Who signs what this machine shows without comparing it says so: a machine that somebody else has
/// taken over would show that one's key.
std::vector<std::string> keysToCertify(const CertifyArguments& arguments,
                                       const Operators& operators) {
    if (arguments.isAll != arguments.keys.empty()) {
        throw KeysError(
            "name the keys, as their operators read them out (\"operator ls "
            "--waiting\" lists them), or say --all");
    }
    if (!arguments.isAll) return arguments.keys;
    std::vector<std::string> keys;
    for (const OperatorKey& key : operators.waiting())
        keys.push_back(key.key);
    return keys;
}

int certify(const CertifyArguments& arguments, Surroundings& around) {
    const FleetDirectory directory(around.directory);
    TrustDatabase trust(directory.trustDatabase());
    Operators operators(trust.connection());
    const std::vector<std::string> keys = keysToCertify(arguments, operators);
    const RootKeys root = readRootFile(arguments.root);
    insistOnRootOf(directory.facts(), root);
    operators.certify(keys, root, around.now);
    for (const OperatorKey& key : operators.all()) {
        if (std::find(keys.begin(), keys.end(), key.key) != keys.end()) {
            around.out << lineOf(key) << '\n';
        }
    }
    if (keys.empty()) around.err << "No key waits.\n";
    return kDone;
}

}  // namespace

Action declareOperatorCertify(CLI::App& app) {
    const auto arguments = std::make_shared<CertifyArguments>();
    app.add_option("--root", arguments->root, "The file with the root")->required();
    app.add_option("KEY", arguments->keys, "Keys, as zavctl login shows them to their operators");
    app.add_flag("--all", arguments->isAll, "All that wait, without comparing them");
    return [arguments](Surroundings& around) { return certify(*arguments, around); };
}

}  // namespace fleet
