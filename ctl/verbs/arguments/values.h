/// The values of a command line's arguments.
#pragma once

#include <deque>
#include <string>
#include <vector>

#include "ctl/verbs/arguments/argument.h"

namespace ctl {

/// One argument's value. The argument's type says which of the members holds it.
struct Value {
    Argument argument{};
    bool isGiven = false;
    bool flag = false;
    unsigned number = 0;
    double seconds = 0;
    std::string text;
    std::vector<std::string> texts;
};

/// Values by argument. Asking for an argument that the verb does not declare is a mistake of the
/// program and throws std::logic_error.
class Values {
public:
    /// Makes room for an argument's value, which starts as its fallback. The reference stays valid
    /// as long as this object.
    Value& add(const Argument& argument);

    /// Takes over other arguments with their values.
    void append(const Values& others);

    bool has(const Argument& argument) const { return of(argument).isGiven; }
    bool flag(const Argument& argument) const { return of(argument).flag; }
    unsigned number(const Argument& argument) const { return of(argument).number; }
    double seconds(const Argument& argument) const { return of(argument).seconds; }
    const std::string& text(const Argument& argument) const { return of(argument).text; }
    const std::vector<std::string>& texts(const Argument& argument) const {
        return of(argument).texts;
    }

private:
    const Value& of(const Argument& argument) const;

    std::deque<Value> values_;
};

}  // namespace ctl
