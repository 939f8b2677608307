// The guard of text outside ASCII. A text on its way into a command line, a file name or a child's
// standard input gets room for one byte per UTF-16 unit and one more, so that what needs more is
// cut at its end. Appended characters make that room, and are what is cut in its place.

#include <algorithm>
#include <vector>

#include "host/guard/guard.h"
#include "host/guard/refusal.h"
#include "host/tables/narrow_text.h"
#include "host/tables/plugin_facts.h"

namespace host {

void checkAscii(CommandRequest& request, Machine& machine);
void mendText(CommandRequest& request, Machine& machine);

namespace {

bool isAscii(std::string_view text) {
    return std::all_of(text.begin(), text.end(),
                       [](char c) { return static_cast<unsigned char>(c) < 0x80; });
}

std::string padded(const std::string& text, const CodePage& codePage) {
    return text + std::string(bytesCut(text, codePage), ' ');
}

/// The name of the metafile stands before the closing quote of a command line, too, of which as
/// many bytes are cut as of the name. The quote that stands there in its place comes right after
/// the name, so that the name ends where it should.
std::string paddedInQuotes(const std::string& name, const CodePage& codePage) {
    std::string padding(bytesCut(name, codePage), ' ');
    if (!padding.empty()) padding.front() = '"';
    return name + padding;
}

/// Each name is used, and so cut, by itself.
std::string paddedEach(const std::string& names, const CodePage& codePage) {
    std::string result;
    for (std::size_t begin = 0; begin <= names.size();) {
        const std::size_t end = std::min(names.find(',', begin), names.size());
        if (begin > 0) result += ',';
        result += padded(names.substr(begin, end - begin), codePage);
        begin = end + 1;
    }
    return result;
}

/// How the row that answers compares with the value. It repeats the value as a whole, so more of a
/// list may be cut than the blanks at its end; nobody would get a row that has to equal it.
_IntfOper comparisonWithAnswer(const std::string& value, const CodePage& codePage) {
    const std::size_t blanks = value.size() - (value.find_last_not_of(' ') + 1);
    return bytesCut(value, codePage) > blanks ? OPER_NE : OPER_EQ;
}

bool mayHoldText(std::string_view column) {
    return std::find(plugin::kTextColumns.begin(), plugin::kTextColumns.end(), column) !=
           plugin::kTextColumns.end();
}

void mend(CommandRequest& request, std::string_view column,
          std::string (*mended)(const std::string&, const CodePage&), const CodePage& codePage) {
    if (isAscii(request.value(column))) return;
    const std::string value = mended(request.value(column), codePage);
    request.setValue(column, value, comparisonWithAnswer(value, codePage));
}

}  // namespace

void checkAscii(CommandRequest& request, Machine&) {
    for (const oxa::Predicate& condition : request.conditions()) {
        if (mayHoldText(condition.column) || isAscii(condition.value)) continue;
        throw Refusal("text", "the value of column " + condition.column + " is not in ASCII",
                      "only CONTEXT, UACONFIG and UASCRIPT take other characters",
                      Refusal::Kind::Malformed);
    }
}

void mendText(CommandRequest& request, Machine& machine) {
    const CodePage& codePage = machine.site().codePage;
    mend(request, plugin::kContextColumn, padded, codePage);
    mend(request, plugin::kMetafileColumn, paddedInQuotes, codePage);
    mend(request, plugin::kScriptsColumn, paddedEach, codePage);
}

}  // namespace host
