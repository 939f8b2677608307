/// A console from the link that opens it to the signal that ends it.
#pragma once

#include <functional>
#include <string>

#include "ctl/client/failure.h"
#include "ctl/console/console_server.h"
#include "ctl/show/page.h"
#include "ctl/verbs/arguments/values.h"
#include "system/file_descriptor.h"

namespace console {

/// Readable once somebody wants the program to end. No thread that starts later gets these signals
/// otherwise.
sys::FileDescriptor endSignals();

/// Whose browsers the options of the command line name. Throws ctl::Failure(kWrongUsage).
Browsers browsersOf(const ctl::Values& given);

/// Prints the link that opens the console, whoever serves it.
ctl::ExitStatus printLink(const std::string& link, ctl::Format format);

/// Serves the page at the port that the command line gives: prints the link, and ends the process
/// after a signal, for which `begins` is called on the server's thread first. Returns when the link
/// cannot be printed. Throws ctl::Failure and std::runtime_error.
ctl::ExitStatus serveUntilSignal(ConsoleSettings settings, Backend& backend,
                                 const ctl::Values& given, ctl::Format format,
                                 const sys::FileDescriptor& signals,
                                 std::function<void()> begins = {});

}  // namespace console
