#include "fleet/server/commands/command_table.h"

namespace fleet {

const std::vector<Command>& commandTable() {
    static const std::vector<Command> table = {
        {"", "serve", "Give hosts their orders, and keep how they ended", declareServe},
        {"keys", "init", "Make all keys of a new fleet", declareKeysInit},
        {"keys", "rotate", "Give the centre new keys and certificates", declareKeysRotate},
        {"", "enrol", "Invite a host, and print the line that it needs", declareEnrol},
        {"operator", "add", "Invite an operator, and print the line that zavctl login needs",
         declareOperatorAdd},
        {"operator", "certify", "Certify operators' keys that wait for the root",
         declareOperatorCertify},
        {"operator", "ls", "List the operators and their keys", declareOperatorList},
        {"revoke", "operator", "Let an operator's keys count no longer", declareRevokeOperator},
        {"revoke", "host", "Let a host's key count no longer", declareRevokeHost},
        {"revoke", "ls", "List the keys that count no longer", declareRevokeList},
        {"", "backup", "Copy the databases, also while the centre works", declareBackup},
        {"", "restore", "Put a copy of the orders back; the centre must not run", declareRestore},
        {"", "doctor", "Look for keys and certificates that end soon", declareDoctor},
    };
    return table;
}

}  // namespace fleet
