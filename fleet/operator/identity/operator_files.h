/// What an operator's machine keeps of each fleet: one file with all of the identity, and another
/// one while a login is under way. Both are for their owner only.
#pragma once

#include <optional>
#include <string>

#include "fleet/bus/messages/invitation.h"
#include "fleet/operator/identity/operator_identity.h"

namespace fleet {

/// A login that waits for its certificate.
struct PendingLogin {
    Invitation invitation;
    KeyPair key;  ///< to be certified
};

/// Operations throw FileError, also for files whose content makes no sense. `url` is that of a
/// centre and throws UrlError if it is not one.
class OperatorFiles {
public:
    /// What is kept makes the directory; one that is there must be its owner's only.
    explicit OperatorFiles(std::string directory);

    /// $XDG_CONFIG_HOME/zavctl/fleet, or ~/.config/zavctl/fleet. Throws FileError if the
    /// environment tells neither.
    static std::string usualDirectory();

    /// Nothing if there was no login at that centre.
    std::optional<OperatorIdentity> identity(const std::string& url) const;
    /// In the place of the one that was there.
    void keep(const OperatorIdentity& identity) const;

    std::optional<PendingLogin> pendingLogin(const std::string& url) const;
    void keep(const PendingLogin& login) const;
    void forgetPendingLogin(const std::string& url) const;

private:
    void makeDirectory() const;
    std::string fileOf(const std::string& url, const char* kind) const;

    const std::string directory_;
};

}  // namespace fleet
