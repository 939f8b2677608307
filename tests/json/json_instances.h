/// What most tests use of the JSON library is compiled once, and not with each of them: half of the
/// time in which such a test compiles is spent there.
#pragma once

#include <nlohmann/json.hpp>
#include <string>

namespace json_instances {

using Chars = nlohmann::detail::iterator_input_adapter<const char*>;
using Text = nlohmann::detail::iterator_input_adapter<std::string::const_iterator>;

}  // namespace json_instances

extern template class nlohmann::basic_json<>;
extern template class nlohmann::detail::serializer<nlohmann::json>;
extern template class nlohmann::detail::lexer<nlohmann::json, json_instances::Chars>;
extern template class nlohmann::detail::parser<nlohmann::json, json_instances::Chars>;
extern template class nlohmann::detail::lexer<nlohmann::json, json_instances::Text>;
extern template class nlohmann::detail::parser<nlohmann::json, json_instances::Text>;
