/// The line that the centre prints for whoever is to join the fleet: a host or an operator.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace fleet {

/// What somebody needs who knows nothing of the fleet yet. Who holds it can join in the name that
/// the centre has written down for its token, once. It does not reach the centre as a whole: the
/// token alone does.
struct Invitation {
    std::string url;        ///< the centre's, by HTTPS
    std::string authority;  ///< SHA-256 of the certificate that vouches for the centre's, 64 hex
    std::string fleet;      ///< the fleet's name
    std::string root;       ///< the public key that certifies the centre and the operators
    std::string token;      ///< 22 characters; secret
};

/// As one word of letters, digits, "-" and "_".
std::string invitationText(const Invitation& invitation);

/// Throws MessageError if it is not one. Blanks and line ends around it do not matter.
Invitation readInvitation(std::string_view text);

/// A token that nobody can guess: 128 random bits.
std::string makeJoinToken();

/// What is kept of a token in its place: 32 bytes from which it cannot be found. Nothing if it has
/// not the form of one.
std::optional<std::string> fingerprintOfToken(std::string_view token);

}  // namespace fleet
