/// Programs that belong to this one and are not there on every machine: what one host needs at a
/// terminal shall stay small.
#pragma once

namespace ctl {

struct SiblingProgram {
    const char* name;     ///< of its file
    const char* missing;  ///< what to say if it is not there
};

/// Whether the program is where becomeProgram() looks for it.
bool isThere(const SiblingProgram& program);

/// Runs the program with these words, the first of which is its name, in the place of this process.
/// It is looked for beside this program, and in ../libexec/zavmgmt from there. Throws
/// Failure(kWrongUsage) if it cannot be run.
[[noreturn]] void becomeProgram(const SiblingProgram& program, char* const* argv);

}  // namespace ctl
