#include "ctl/verbs/help/argument_text.h"

namespace ctl {

std::string valueNameOf(const Argument& argument) {
    if (argument.valueName != nullptr) return argument.valueName;
    switch (argument.type) {
        case Argument::Type::Number:
            return "N";
        case Argument::Type::Seconds:
            return "SECONDS";
        case Argument::Type::Text:
        case Argument::Type::Texts:
            break;
    }
    return "TEXT";
}

std::string helpOf(const Argument& argument) {
    std::string help = argument.help;
    if (argument.fallback != nullptr)
        help += std::string("; ") + argument.fallback + " if not given";
    if (argument.excludes != nullptr) help += std::string("; not with ") + argument.excludes;
    if (argument.needs != nullptr) help += std::string("; only with ") + argument.needs;
    return help;
}

}  // namespace ctl
