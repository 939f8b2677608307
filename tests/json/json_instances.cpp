#include "tests/json/json_instances.h"

template class nlohmann::basic_json<>;
template class nlohmann::detail::serializer<nlohmann::json>;
template class nlohmann::detail::lexer<nlohmann::json, json_instances::Chars>;
template class nlohmann::detail::parser<nlohmann::json, json_instances::Chars>;
template class nlohmann::detail::lexer<nlohmann::json, json_instances::Text>;
template class nlohmann::detail::parser<nlohmann::json, json_instances::Text>;
