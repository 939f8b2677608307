/// Shapes of JSON documents, as JSON Schema writes them (draft 2020-12). Each endpoint describes
/// its own documents beside the code that makes them.
#pragma once

#include <initializer_list>
#include <map>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "routes/route.h"

namespace routes {

/// The schemas that have names, each once. Immutable when the description is complete; one thread.
class Components {
public:
    using Json = nlohmann::ordered_json;

    /// A reference to the schema, whose name is its title. Adds it, and what it refers to itself.
    /// Throws std::logic_error when two schemas have one title.
    Json ref(Schema* schema);

    /// The schemas by their names, in the order of the alphabet.
    Json all() const;

private:
    std::map<Schema*, std::string> names_;
    std::map<std::string, Json> shapes_;
};

namespace shape {

using Json = nlohmann::ordered_json;

/// A member of an object.
struct Property {
    const char* name;
    Json shape;
    Need need = Need::Required;
};

/// Describes a member; may stand beside a reference.
Json about(const char* doc, Json shape);

Json text(const char* doc);
/// One of these texts.
Json oneOf(const char* doc, const std::vector<std::string>& values);
/// One of these numbers.
Json oneNumberOf(const char* doc, const std::vector<int>& values);
Json wholeNumber(const char* doc, long long least = 0);
Json yesOrNo(const char* doc);
Json listOf(const char* doc, Json items);
/// The same, or null.
Json orNull(Json shape);

/// `title` is the name for Components.
Json object(const char* title, const char* doc, const std::vector<Property>& properties);

}  // namespace shape

}  // namespace routes
