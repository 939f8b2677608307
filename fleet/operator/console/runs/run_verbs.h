/// The verbs of a fleet that a browser may have run.
#pragma once

#include <string_view>

#include "ctl/verbs/verb.h"

namespace fleet {

/// One row of the table. What arguments and options there are stands in the verb's declaration.
struct RunVerb {
    const char* name;  ///< as it is typed
    /// The last argument's text comes as standard input. It may hold passwords, and everybody on
    /// this machine sees what a program is called with.
    bool readsInput = false;
};

/// The row of that name; null if a browser may not have it run.
const RunVerb* findRunVerb(std::string_view name);

/// Its declaration.
const ctl::Verb& declarationOf(const RunVerb& verb);

/// The option that a browser calls `name`, without its dashes; null if the verb has none such. What
/// names a file of this machine, and what the console decides by itself, is not for a browser.
const ctl::Argument* findRunOption(const ctl::Verb& verb, std::string_view name);

}  // namespace fleet
