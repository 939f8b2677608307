/// console: a page in a browser. A program of its own serves it, with the same arguments.
#pragma once

#include <string>
#include <vector>

#include "ctl/verbs/arguments/argument.h"
#include "ctl/verbs/arguments/values.h"

namespace ctl {

constexpr Argument kConsolePort =
    numberOption("--port", "Port on 127.0.0.1; any free one if not given").between(0, 65535);

constexpr Argument kBrowserUser =
    textOption("--browser-user",
               "Serve this user's browser, too; without it one's own and, behind\n"
               "sudo, that of whoever called it")
        .called("NAME");

/// The words of the options that say which host is meant and how long to wait for it, as far as
/// they are given.
std::vector<std::string> hostWords(const Values& given);

/// What the console's program is run with, from its name on.
std::vector<std::string> consoleWords(const Values& given);

}  // namespace ctl
