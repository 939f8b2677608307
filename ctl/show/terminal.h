/// What the program's outputs are written to.
#pragma once

#include <cstddef>
#include <string>

namespace ctl {

/// One of the two outputs. Both are plain until lookAtTerminals().
struct Output {
    bool isColoured = false;
    std::size_t columns = 0;  ///< lines are folded to so many; 0: they are not
};

/// Finds out what the outputs are. A terminal is coloured unless $NO_COLOR is set or it is a dumb
/// one; text on it is folded to its width, `foldsOutput` saying whether that goes for standard
/// output too, which may hold a document. To be called once, before anything is printed.
void lookAtTerminals(bool foldsOutput);

const Output& standardOutput();
const Output& standardError();

enum class Tone { Good, Bad, Attention };

/// The text in a colour where the output has colours.
std::string toned(const std::string& text, Tone tone, const Output& output);

}  // namespace ctl
