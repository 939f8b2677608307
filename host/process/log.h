/// What the host says to its operator, on standard error or in the system's journal.
#pragma once

#include <chrono>
#include <string>
#include <string_view>

namespace host {

/// How much a line matters, as the system's journal counts it.
enum class Priority { Error = 3, Warning = 4, Notice = 5, Info = 6 };

enum class LogFormat {
    Text,  ///< a line with time and level; in the system's journal their fields
    Json,  ///< a line that is a JSON object, also where there is a journal
};

/// One line of the log. Clients' words may be in its texts, so blanks stand for control characters
/// wherever a terminal might obey them.
struct LogEntry {
    Priority priority;
    std::string text;
    std::string task;  ///< the identifier of the task that it is about; "" if none
    std::chrono::system_clock::time_point time;
};

/// "zavhost: no home": for whoever starts a program and reads what it answers.
std::string spokenLine(const LogEntry& entry);
/// "2025-01-31T12:00:00.000Z error zavhost: no home".
std::string textLine(const LogEntry& entry);
/// {"time": "...", "level": "error", "task": "...", "text": "no home"}; without a task if there is
/// none. A text that is too long for a line of 4 KiB is cut.
std::string jsonLine(const LogEntry& entry);
/// "<3>no home": for a standard error that the system's journal reads.
std::string prefixedLine(const LogEntry& entry);

/// Whether standard error goes to the system's journal. Any thread.
bool logsToJournal();

/// Sends an entry with its fields to the system's journal, which listens at this path. False when
/// it does not take it.
bool sendToJournal(const LogEntry& entry, std::string_view path);

/// From now on what is said are events of a log in this format; before it is spoken. Any thread.
void beginLog(LogFormat format);

/// Says it, in one piece, of at most 4 KiB on standard error; what nobody takes for a second is
/// lost. `task` is the identifier of the task that it is about. Any thread.
void say(Priority priority, const std::string& text, const std::string& task = "");

}  // namespace host
