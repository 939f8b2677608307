#include "host/guard/machine/translator.h"

#include "host/process/children/run_command.h"

namespace host {
namespace {

std::string trimmed(const std::string& text) {
    constexpr const char* kBlanks = " \t\r\n\v\f";
    const std::size_t begin = text.find_first_not_of(kBlanks);
    if (begin == std::string::npos) return "";
    return text.substr(begin, text.find_last_not_of(kBlanks) - begin + 1);
}

std::string lastLine(const std::string& text) {
    const std::string whole = trimmed(text);
    return whole.substr(whole.rfind('\n') + 1);
}

}  // namespace

Resolution instanceByTranslator(const std::string& translator, const std::string& product,
                                const std::string& target) {
    if (translator.empty()) return {"", "the home has no translator"};
    const CommandResult answer = runCommand({translator, "-i", target, "-pc", product});
    if (answer.succeeded()) return {trimmed(answer.out), ""};
    const std::string said = lastLine(answer.err);
    return {"", said.empty() ? translator + " " + endInWords(answer) : said};
}

std::string universalAgentInstance(const std::string& target) {
    const std::size_t suffix = target.find(":UA");
    if (suffix == std::string::npos || suffix == 0) return "";
    const std::size_t host = target.substr(0, suffix).find(':');
    return host == std::string::npos ? "" : trimmed(target.substr(0, host));
}

}  // namespace host
