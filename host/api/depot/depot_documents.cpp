#include "host/api/depot/depot_documents.h"

#include <cctype>
#include <ctime>
#include <nlohmann/json.hpp>

#include "host/api/schema.h"
#include "host/tables/code_page.h"

namespace host {

Schema depotEntrySchema, timeSchema;

namespace {

using nlohmann::ordered_json;

std::string percentEncoded(const std::string& bytes) {
    static const char* const kDigits = "0123456789ABCDEF";
    std::string text;
    for (const char c : bytes) {
        const auto byte = static_cast<unsigned char>(c);
        if (std::isalnum(byte) != 0 && byte < 128) {
            text += c;
        } else {
            text += {'%', kDigits[byte >> 4], kDigits[byte & 15U]};
        }
    }
    return text;
}

const char* nameOf(DepotEntry::Type type) {
    switch (type) {
        case DepotEntry::Type::File:
            return "file";
        case DepotEntry::Type::Directory:
            return "directory";
        case DepotEntry::Type::Link:
            return "link";
        case DepotEntry::Type::Other:
            break;
    }
    return "other";
}

/// The time as RFC 3339, in UTC.
std::string timeText(const std::timespec& time) {
    std::tm parts{};
    ::gmtime_r(&time.tv_sec, &parts);
    char text[40];
    std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &parts);
    return text;
}

}  // namespace

void putName(ordered_json& document, const char* member, const std::string& name) {
    static const CodePage utf8("UTF-8");
    const std::string text = utf8.toUtf8(name);
    document[member] = text;
    if (text != name) document["escaped"] = percentEncoded(name);
}

ordered_json documentOf(const DepotEntry& entry) {
    ordered_json document;
    putName(document, "name", entry.name);
    document["type"] = nameOf(entry.type);
    document["bytes"] = entry.bytes;
    document["modified"] = timeText(entry.modified);
    return document;
}

nlohmann::ordered_json escapedShape() {
    return shape::text("the bytes of the name, percent-encoded, if it is not UTF-8");
}

nlohmann::ordered_json depotTypeShape() {
    using Kind = DepotEntry::Type;
    return shape::oneOf("what it is", {nameOf(Kind::File), nameOf(Kind::Directory),
                                       nameOf(Kind::Link), nameOf(Kind::Other)});
}

nlohmann::ordered_json depotEntrySchema(Components& components) {
    return shape::object(
        "DepotEntry", "An entry of a directory.",
        {{"name", shape::text("its name")},
         {"escaped", escapedShape(), Need::Optional},
         {"type", depotTypeShape()},
         {"bytes", shape::wholeNumber("its size; 0 for all but files")},
         {"modified", shape::about("when it was changed", components.ref(timeSchema))}});
}

}  // namespace host
