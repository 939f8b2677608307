/// Who may give orders, and who gives them numbers: what the fleet's offline root has certified.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

struct Certificate {
    enum class Holder { Centre, Operator };

    std::string fleet;  ///< the fleet's name: a certificate of one counts in no other
    Holder holder = Holder::Operator;
    std::string name;  ///< for people
    std::string key;   ///< the holder's signing key
    Moment until{};    ///< when it ends
    // What an operator may: empty lists mean nothing, "*" stands for any characters.
    std::vector<std::string> commands;
    std::vector<std::string> products;
    std::string selector;  ///< the hosts
};

/// Whether a certificate lets its operator send that command for that product. Commands that
/// concern no product, such as a cancel, need the command only.
bool allows(const Certificate& certificate, std::string_view command, std::string_view product);

std::string signCertificate(const Certificate& certificate, const KeyPair& root);

/// A certificate of this fleet that its root has signed. Throws MessageError otherwise. Whether it
/// has ended, who asks decides.
Certificate readCertificate(std::string_view bytes, std::string_view root, std::string_view fleet);

}  // namespace fleet
