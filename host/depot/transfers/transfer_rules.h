/// Which transfers the host takes, and what becomes of their names.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "host/depot/depot.h"
#include "host/depot/transfers/arrival_directory.h"
#include "host/tables/code_page.h"

namespace host {

/// Why a transfer is not taken.
struct Objection {
    std::string guard;   ///< as the guards' page lists it; empty for what always holds
    std::string reason;  ///< a sentence
    std::string hint;    ///< the way out; may be empty
};

/// Immutable; any thread.
class TransferRules {
public:
    /// The depot outlives this object. Guarded, the constructor tries whether the plug-in can
    /// convert line ends, for which it needs links from `home`/tmp into the depot.
    TransferRules(const Depot& depot, const std::string& home, CodePage codePage, bool guarded);

    bool guarded() const { return guarded_; }

    /// Why no line ends can be converted without losing the file; empty when they can, and
    /// unguarded.
    const std::string& conversionProblem() const { return conversionProblem_; }

    /// The name below the depot under which a transfer arrives, with slashes for backslashes.
    /// Nothing when the name is no text in the code page: then it changes on its way.
    std::optional<std::string> arrivalName(const std::string& name) const;

    /// Where a transfer of that name ends up: a path without links.
    std::string destination(const std::string& name) const;

    /// The directory of a name; for other names in it, too, see isIn.
    ArrivalDirectory directoryOf(const std::string& name) const;
    bool isIn(const std::string& name, const ArrivalDirectory& directory) const;
    /// The name without its directory.
    std::string fileOf(const std::string& name) const;

    /// Whether two names can be one file: if not, their destinations need not be looked up.
    bool mayBeOne(const std::string& name, const std::string& other) const;

    /// Whether the host has directories of its own where a transfer could get to.
    bool keepsAny() const { return !kept_.empty(); }

    /// Whether the plug-in drops carriage returns and Ctrl-Z from a file of that name.
    bool isConverted(const std::string& name) const;

    /// What stands against a transfer to this destination, whatever else is under way; `startsFile`
    /// is false for a batch that is appended.
    std::optional<Objection> objectionTo(const std::string& name, const std::string& destination,
                                         bool startsFile) const;

    /// Whether the plug-in will refuse the name because it leads out of the depot.
    bool leadsOut(const std::string& name, const ArrivalDirectory& directory) const;

    /// Why the plug-in cannot take a transfer of that name whatever the host says: it leads out, is
    /// too long, or something is in its way. Empty when it can.
    std::string whyImpossible(const std::string& name, const ArrivalDirectory& directory) const;

private:
    bool isKept(const std::string& name, const std::string& destination, bool startsFile) const;
    bool canConvertAt(const std::string& name) const;
    /// When the plug-in cuts the path.
    Objection objectionToCut(const std::string& name) const;
    std::string pathOf(const std::string& name) const;
    /// Its name as it arrives, or as it is when it is no text.
    std::string textOf(const std::string& name) const { return arrivalName(name).value_or(name); }

    const Depot& depot_;
    /// The host's own directories, without links: those that have to do with the depot. Others
    /// cannot be reached, because transfers are resolved beneath the depot.
    const std::vector<std::string> kept_;
    const std::string temporaries_;  ///< the directory of the plug-in's temporary file
    const CodePage codePage_;
    const bool guarded_;
    const std::string conversionProblem_;  ///< empty when there is none
};

}  // namespace host
