/// All subcommands of zavfleetd.
#pragma once

#include <vector>

#include "fleet/server/commands/command.h"

namespace fleet {

const std::vector<Command>& commandTable();

// Each is declared in a file of its name.
Action declareServe(CLI::App& app);
Action declareKeysInit(CLI::App& app);
Action declareKeysRotate(CLI::App& app);
Action declareEnrol(CLI::App& app);
Action declareOperatorAdd(CLI::App& app);
Action declareOperatorCertify(CLI::App& app);
Action declareOperatorList(CLI::App& app);
Action declareRevokeHost(CLI::App& app);
Action declareRevokeOperator(CLI::App& app);
Action declareRevokeList(CLI::App& app);
Action declareDoctor(CLI::App& app);
Action declareBackup(CLI::App& app);
Action declareRestore(CLI::App& app);

}  // namespace fleet
