#include "ctl/verbs/arguments/values.h"

#include <cstdlib>
#include <cstring>
#include <stdexcept>

namespace ctl {

Value& Values::add(const Argument& argument) {
    Value& value = values_.emplace_back();
    value.argument = argument;
    if (argument.fallback == nullptr) return value;
    value.text = argument.fallback;
    value.seconds = std::strtod(argument.fallback, nullptr);
    value.number = static_cast<unsigned>(std::strtoul(argument.fallback, nullptr, 10));
    return value;
}

void Values::append(const Values& others) {
    values_.insert(values_.end(), others.values_.begin(), others.values_.end());
}

const Value& Values::of(const Argument& argument) const {
    for (const Value& value : values_) {
        if (std::strcmp(value.argument.name, argument.name) == 0) return value;
    }
    throw std::logic_error(std::string(argument.name) + " is not declared");
}

}  // namespace ctl
