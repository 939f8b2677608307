// The guard of values that become words of a command line. The plug-in splits command lines at
// blanks, and some of them pass a shell: whatever is no plain name could say something else there.

#include <algorithm>
#include <string_view>

#include "host/guard/guard.h"
#include "host/guard/refusal.h"
#include "host/guard/wording.h"
#include "host/tables/plugin_facts.h"

namespace host {

void checkValues(CommandRequest& request, Machine& machine);

namespace {

bool isLetterOrDigit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

/// The form of one column's value.
struct Form {
    std::string_view column;
    const char* what;
    std::string_view others;  ///< the characters that it may have besides letters and digits
    const char* described;
};

constexpr Form kProduct = {plugin::kProductColumn, "a product code", "", "letters and digits"};
constexpr Form kVersionForm = {plugin::kVersionColumn, "a version", "._-", "letters, digits and . _ -"};
constexpr Form kTarget = {plugin::kTargetColumn, "a managed system name", "._-:/",
                          "letters, digits and . _ - : /"};
constexpr Form kInstance = {plugin::kTargetColumn, "the name of an instance", "._-",
                            "letters, digits and . _ -"};

/// Whether a part of it, between the separators of managed system names, is "." or "..". Where such
/// a part becomes a part of a path, that path names another directory.
bool namesADirectory(std::string_view value) {
    while (true) {
        const std::size_t end = value.find_first_of(":/");
        const std::string_view part = value.substr(0, end);
        if (part == "." || part == "..") return true;
        if (end == std::string_view::npos) return false;
        value.remove_prefix(end + 1);
    }
}

void check(const CommandRequest& request, const Form& form, const CodePage& codePage) {
    const std::string& value = request.value(form.column);
    const bool fits = std::all_of(value.begin(), value.end(), [&form](char c) {
        return isLetterOrDigit(c) || form.others.find(c) != std::string_view::npos;
    });
    const auto refuse = [&](const std::string& hint) {
        throw Refusal(
            "values",
            std::string(form.column) + " " + quoted(value, codePage) + " is not " + form.what, hint,
            Refusal::Kind::Malformed);
    };
    // Programs would take a name that begins with "-" for an option.
    if (!fits || (!value.empty() && value.front() == '-')) {
        refuse(std::string("it is made of ASCII ") + form.described +
               ", and does not begin with -");
    }
    if (namesADirectory(value)) refuse("no part of it is . or .., which name directories");
}

}  // namespace

void checkValues(CommandRequest& request, Machine& machine) {
    const CodePage& codePage = machine.site().codePage;
    check(request, kProduct, codePage);
    check(request, kVersionForm, codePage);
    check(request, request.targetIsInstance() ? kInstance : kTarget, codePage);
}

}  // namespace host
