/// What the fleet's programs say to their operators, on standard error.
#pragma once

#include <string>

namespace fleet {

/// How much a line matters, as the system's journal counts it.
enum class Priority { Error = 3, Warning = 4, Notice = 5, Info = 6 };

/// The name that stands before each line; before other threads exist.
void nameProgram(const std::string& name);

/// Says it in one line: "zavlink: text", and with its priority where the system's journal reads
/// standard error. Others' words may be in the text, so control characters become blanks; beyond
/// 4 KiB it is cut. Any thread.
void say(Priority priority, const std::string& text);

/// That line, for a reader of either kind.
std::string lineOf(Priority priority, const std::string& text, bool isForJournal);

}  // namespace fleet
