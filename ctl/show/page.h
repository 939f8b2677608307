/// A command's final output, as a value, so that it can be tested without a terminal.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/failure.h"

namespace ctl {

/// For people, or one JSON document for programs.
enum class Format { Text, Json };

struct Page {
    std::string out;  ///< for standard output
    std::string err;  ///< for standard error
    ExitStatus status = kSuccess;
};

/// A line for standard error: "zavctl: text".
std::string complaint(const std::string& text);

/// The document with a line end, indented. Text that is not valid UTF-8 is mended, never refused.
std::string jsonText(const nlohmann::json& document);

/// A page that is one JSON document.
Page jsonPage(const nlohmann::json& document, ExitStatus status = kSuccess);

/// Writes and flushes both outputs and returns the page's status. Standard output keeps the error
/// if it cannot be written.
ExitStatus print(const Page& page);

}  // namespace ctl
