/// What a task's commands have written.
#pragma once

#include <string>

#include "ctl/show/page.h"
#include "secrets/masked.h"

namespace ctl {

/// The output of commands, piece by piece, for the same of this program's outputs; all of it is for
/// standard error where a document stands on the other. Passwords and the like are "***" wherever
/// the pieces end, and a terminal gets no control characters.
class OutputPages {
public:
    explicit OutputPages(Format format) : format_(format) {}

    /// The next piece of "stdout" or "stderr".
    Page next(const std::string& stream, const std::string& text);

private:
    Format format_;
    secrets::Masker out_;
    secrets::Masker err_;
};

}  // namespace ctl
