// The pieces that schemas are made of.
#include "routes/description/schema.h"

#include <gtest/gtest.h>

namespace routes {

Schema namedPiece, pieceThatRefers;

nlohmann::ordered_json namedPiece(Components&) {
    return shape::object("Piece", "A piece.", {{"size", shape::wholeNumber("its size", 1)}});
}

nlohmann::ordered_json pieceThatRefers(Components& components) {
    return shape::object("Pair", "Two pieces.",
                         {{"left", components.ref(namedPiece)},
                          {"right", components.ref(namedPiece), Need::Optional}});
}

}  // namespace routes

namespace {

using Json = nlohmann::ordered_json;
namespace shape = routes::shape;

TEST(SchemaComponents, HaveWhatIsReferredToOnce) {
    routes::Components components;
    EXPECT_EQ(components.ref(routes::pieceThatRefers)["$ref"], "#/components/schemas/Pair");
    EXPECT_EQ(components.ref(routes::namedPiece)["$ref"], "#/components/schemas/Piece");
    EXPECT_EQ(components.all().size(), 2U);
    EXPECT_EQ(components.all()["Piece"]["properties"]["size"]["minimum"], 1);
}

TEST(SchemaShapes, ListTheMembersThatAreAlwaysThere) {
    routes::Components components;
    const Json pair = routes::pieceThatRefers(components);
    EXPECT_EQ(pair["required"], Json::array({"left"}));
    EXPECT_EQ(pair["properties"].size(), 2U);
    const Json open = shape::object("Open", "", {{"a", shape::text(""), routes::Need::Optional}});
    EXPECT_FALSE(open.contains("required")) << "an empty list is no schema";
}

TEST(SchemaShapes, MayBeNull) {
    EXPECT_EQ(shape::orNull(shape::text("a"))["type"], Json::array({"string", "null"}));
    routes::Components components;
    const Json either = shape::orNull(shape::about("which", components.ref(routes::namedPiece)));
    EXPECT_EQ(either["description"], "which");
    ASSERT_EQ(either["anyOf"].size(), 2U);
    EXPECT_EQ(either["anyOf"][0]["$ref"], "#/components/schemas/Piece");
    EXPECT_EQ(either["anyOf"][1]["type"], "null");
}

}  // namespace
