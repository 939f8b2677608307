/// Pages of verbs, from their declarations.
#pragma once

#include <string>
#include <vector>

#include "ctl/verbs/vocabulary.h"

namespace manual {

/// "config get" is the page zavctl-config-get.
std::string pageOf(const ctl::Verb& verb);

/// A list of the positionals, or of the others; "" if there are none.
std::string listOf(const ctl::ArgumentList& arguments, bool positionals);

/// An entry for each verb, with a reference to its page.
std::string entriesOf(const std::vector<const ctl::Verb*>& verbs);

/// The exit statuses of all verbs.
std::string exitStatuses();

/// The verb in a page about several: a subsection.
std::string subsectionOf(const ctl::Verb& verb);

/// Where the pages of a program's verbs go, and what they have in common.
struct VerbPages {
    std::string templates;
    std::string directory;
    std::string date;
    std::string program;                    ///< its own page, to which those of verbs refer
    ctl::ArgumentList globals;              ///< that go with every verb
    std::vector<const ctl::Verb*> verbs{};  ///< that have pages

    /// Writes them. What a verb does beyond its one line of help stands in the templates' folder
    /// "verbs", if there is more to say.
    void write() const;

private:
    std::string relativesOf(const ctl::Verb& verb) const;
    void writeVerb(const ctl::Verb& verb) const;
};

}  // namespace manual
