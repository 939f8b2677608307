/// The errors of the XML parser.
#pragma once

namespace xml1 {

/// The text of an error code, or null for a code that has none. The codes are expat's; the texts
/// are kept here because users of the parser show them and an update of expat must not change them.
const char* errorText(int code);

}  // namespace xml1
