/// The depot's content as JSON.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "host/depot/depot.h"

namespace host {

/// A file name as text. Names that are not UTF-8 are shown as far as they go, and then the member
/// "escaped" of `document` gets their bytes, percent-encoded.
void putName(nlohmann::ordered_json& document, const char* member, const std::string& name);

nlohmann::ordered_json documentOf(const DepotEntry& entry);

/// What "escaped" and the type of an entry look like, for the interface's description.
nlohmann::ordered_json escapedShape();
nlohmann::ordered_json depotTypeShape();

}  // namespace host
