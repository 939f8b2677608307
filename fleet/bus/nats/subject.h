/// Which texts are subjects of the bus.
#pragma once

#include <string_view>

namespace fleet {

/// Whether something can be published there: tokens of visible ASCII characters, joined by dots,
/// none of them empty or a wildcard. Anything else could become another command on its way to the
/// server.
bool isSubject(std::string_view text);

/// Whether it can be subscribed to: the same, but a token may be "*", and the last one ">".
bool isSubjectPattern(std::string_view text);

/// Whether the text is one token of a subject.
bool isSubjectToken(std::string_view text);

}  // namespace fleet
