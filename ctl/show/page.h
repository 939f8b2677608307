/// A command's final output, as a value, so that it can be tested without a terminal.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/failure.h"

namespace ctl {

/// For people, or one JSON document for programs.
enum class Format { Text, Json };

struct Page {
    std::string out = {};  ///< for standard output
    std::string err = {};  ///< for standard error
    ExitStatus status = kSuccess;
    /// `out` is a text of somebody else's, whose lines stay as they are.
    bool isVerbatim = false;
};

/// A line for standard error: "zavctl: text". Control characters are shown as \xNN, secrets as ***.
std::string complaint(const std::string& text);

/// Why a command could not go on: the reason and, on a line of its own, the way out. As JSON there
/// is also a document {"error": "...", "guard": "...", "hint": "..."} without the empty members.
Page failurePage(const Failure& failure, Format format);

/// The document with a line end, indented. Text that is not valid UTF-8 is mended, never refused,
/// and control characters are written as \uNNNN.
std::string jsonText(const nlohmann::json& document);

/// The same on one line without a line end.
std::string jsonLine(const nlohmann::json& document);

/// A page that is one JSON document.
Page jsonPage(const nlohmann::json& document, ExitStatus status = kSuccess);

/// Writes and flushes both outputs and returns the page's status. On a terminal, long lines are
/// broken between words. Standard output keeps the error
/// if it cannot be written.
ExitStatus print(const Page& page);

}  // namespace ctl
