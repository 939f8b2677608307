/// Whose output a browser asks for.
#pragma once

#include <string>

#include "http/handler.h"

namespace fleet {

struct OutputRequest {
    std::string host;   ///< its name or its key
    std::string task;   ///< its name or its number on the host, or the order's identifier
    std::string after;  ///< behind which position it goes on; "" at the beginning
};

/// Reads "...?host=NAME&task=ID" and the field Last-Event-ID. Throws ctl::Failure(kWrongUsage) for
/// whatever else there is, and for texts that no host and no task are called by.
OutputRequest readOutputRequest(const http::Request& request);

/// Whether a text can be a host's position in an output: a short word of plain letters, which may
/// stand in a header field.
bool isOutputPosition(const std::string& text);

}  // namespace fleet
