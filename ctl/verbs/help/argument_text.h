/// What the help and the manual say of an argument, from its declaration.
#pragma once

#include <string>

#include "ctl/verbs/arguments/argument.h"

namespace ctl {

/// The word that stands for an option's value: "PATH", "SECONDS".
std::string valueNameOf(const Argument& argument);

/// What it is for, its default and what it goes with; no full stop. Line ends are those of the
/// declaration.
std::string helpOf(const Argument& argument);

}  // namespace ctl
