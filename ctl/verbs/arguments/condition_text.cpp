#include "ctl/verbs/arguments/condition_text.h"

#include "ctl/client/failure.h"

namespace ctl {

Condition parseCondition(const std::string& text) {
    const std::size_t at = text.find_first_of("=!<>~");
    if (at == std::string::npos || at == 0) {
        throw Failure(kWrongUsage, "\"" + text + "\" is no condition; write COLUMN=VALUE");
    }
    std::string op(1, text[at]);
    if (op != "=" && op != "~" && text.compare(at + 1, 1, "=") == 0) op += '=';
    if (op == "!")
        throw Failure(kWrongUsage, "\"" + text + "\" is no condition; write COLUMN!=VALUE");
    const std::string value = text.substr(at + op.size());
    return {text.substr(0, at), op == "~" ? "like" : op, value};
}

}  // namespace ctl
