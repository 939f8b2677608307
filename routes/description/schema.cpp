#include "routes/description/schema.h"

#include <stdexcept>
#include <utility>

namespace routes {

Components::Json Components::ref(Schema* schema) {
    auto known = names_.find(schema);
    if (known == names_.end()) {
        Json shape = schema(*this);
        const std::string name = shape.at("title");
        if (!shapes_.emplace(name, std::move(shape)).second) {
            throw std::logic_error("two schemas have the title " + name);
        }
        known = names_.emplace(schema, name).first;
    }
    return {{"$ref", "#/components/schemas/" + known->second}};
}

Components::Json Components::all() const {
    Json all = Json::object();
    for (const auto& [name, shape] : shapes_)
        all[name] = shape;
    return all;
}

namespace shape {

Json about(const char* doc, Json shape) {
    shape["description"] = doc;
    return shape;
}

Json text(const char* doc) {
    return {{"type", "string"}, {"description", doc}};
}

Json oneOf(const char* doc, const std::vector<std::string>& values) {
    return {{"type", "string"}, {"enum", values}, {"description", doc}};
}

Json oneNumberOf(const char* doc, const std::vector<int>& values) {
    return {{"type", "integer"}, {"enum", values}, {"description", doc}};
}

Json wholeNumber(const char* doc, long long least) {
    return {{"type", "integer"}, {"minimum", least}, {"description", doc}};
}

Json yesOrNo(const char* doc) {
    return {{"type", "boolean"}, {"description", doc}};
}

Json listOf(const char* doc, Json items) {
    return {{"type", "array"}, {"items", std::move(items)}, {"description", doc}};
}

Json orNull(Json shape) {
    if (shape.contains("type")) {
        shape["type"] = Json::array({shape["type"], "null"});
        return shape;
    }
    Json either = Json::object();
    if (shape.contains("description")) {
        either["description"] = shape["description"];
        shape.erase("description");
    }
    either["anyOf"] = Json::array({std::move(shape), Json{{"type", "null"}}});
    return either;
}

Json object(const char* title, const char* doc, const std::vector<Property>& properties) {
    Json members = Json::object();
    Json required = Json::array();
    for (const Property& property : properties) {
        members[property.name] = property.shape;
        if (property.need == Need::Required) required.push_back(property.name);
    }
    Json shape = {{"title", title}, {"type", "object"}, {"description", doc}};
    shape["properties"] = std::move(members);
    if (!required.empty()) shape["required"] = std::move(required);
    return shape;
}

}  // namespace shape

}  // namespace routes
