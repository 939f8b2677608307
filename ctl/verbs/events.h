/// events: the outcomes of tasks as they come.
#pragma once

#include <cstddef>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/http/event_parser.h"
#include "ctl/show/page.h"

namespace ctl {

/// One outcome as it is printed, with its identifier unless that is empty. As JSON it is an element
/// of the list "events" of one document; `isFirst` says whether others stand before it.
std::string showEvent(const nlohmann::json& row, bool isFirst, Format format,
                      const std::string& id = {});

/// What an event says that is no outcome.
std::string wordsFor(const ServerEvent& event);

}  // namespace ctl
