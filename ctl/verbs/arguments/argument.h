/// The arguments of a command as data. The command line and the help follow from these
/// declarations.
#pragma once

#include <cstddef>

namespace ctl {

/// What a shell may offer in place of a value.
enum class Completion {
    Nothing,
    Product,  ///< that is installed
    Instance,
    Transaction,
    State,  ///< of a task
    Table,
    DepotFile,
    DepotProduct,  ///< a folder of the depot
    DepotVersion,  ///< a folder of a product's folder in the depot
    LocalFile,
    Verb,
};

/// One argument. Declarations read like
///     constexpr Argument kPort =
///         numberOption("--port", "Port of the console").between(1, 65535);
/// All texts must live as long as the program.
struct Argument {
    enum class Kind {
        Positional,  ///< found by its place
        Option,      ///< "--name VALUE"
        Flag,        ///< "--name"
    };
    enum class Type {
        Text,
        Texts,    ///< as many words as there are; of positionals, the last only
        Number,   ///< a whole number, not negative
        Seconds,  ///< may have a fraction
    };

    Kind kind;
    Type type;
    const char* name;  ///< with its dashes if it is not a positional
    const char* help;  ///< may have several lines; no full stop

    const char* valueName = nullptr;  ///< in the help; that of the type if null
    const char* fallback = nullptr;   ///< the value when it is not given; none if null
    const char* excludes = nullptr;   ///< name of an argument that must not stand beside it
    const char* needs = nullptr;      ///< name of an argument that must stand beside it
    double least = 0;
    double most = 0;  ///< of a Number or Seconds; no limits if `least` is not below it
    Completion completion = Completion::Nothing;
    bool isRequired = false;
    bool isHidden = false;  ///< works, but is not shown
    /// Words of another program's command line: "--" must stand before them if options are among
    /// them, which would be taken for the verb's own.
    bool isForeign = false;

    constexpr Argument required() const {
        Argument changed = *this;
        changed.isRequired = true;
        return changed;
    }
    constexpr Argument hidden() const {
        Argument changed = *this;
        changed.isHidden = true;
        return changed;
    }
    constexpr Argument foreign() const {
        Argument changed = *this;
        changed.isForeign = true;
        return changed;
    }
    constexpr Argument called(const char* value) const {
        Argument changed = *this;
        changed.valueName = value;
        return changed;
    }
    constexpr Argument otherwise(const char* value) const {
        Argument changed = *this;
        changed.fallback = value;
        return changed;
    }
    constexpr Argument without(const char* other) const {
        Argument changed = *this;
        changed.excludes = other;
        return changed;
    }
    constexpr Argument with(const char* other) const {
        Argument changed = *this;
        changed.needs = other;
        return changed;
    }
    constexpr Argument between(double low, double high) const {
        Argument changed = *this;
        changed.least = low;
        changed.most = high;
        return changed;
    }
    constexpr Argument completedBy(Completion source) const {
        Argument changed = *this;
        changed.completion = source;
        return changed;
    }
};

constexpr Argument positional(const char* name, const char* help) {
    return {Argument::Kind::Positional, Argument::Type::Text, name, help};
}
constexpr Argument positionals(const char* name, const char* help) {
    return {Argument::Kind::Positional, Argument::Type::Texts, name, help};
}
constexpr Argument textOption(const char* name, const char* help) {
    return {Argument::Kind::Option, Argument::Type::Text, name, help};
}
constexpr Argument numberOption(const char* name, const char* help) {
    return {Argument::Kind::Option, Argument::Type::Number, name, help};
}
constexpr Argument secondsOption(const char* name, const char* help) {
    return {Argument::Kind::Option, Argument::Type::Seconds, name, help};
}
constexpr Argument flag(const char* name, const char* help) {
    return {Argument::Kind::Flag, Argument::Type::Text, name, help};
}

/// A verb's arguments: a view of an array that lives as long as the program.
class ArgumentList {
public:
    constexpr ArgumentList() = default;
    template <std::size_t count>
    constexpr ArgumentList(const Argument (&arguments)[count]) : first_(arguments), count_(count) {}

    constexpr const Argument* begin() const { return first_; }
    constexpr const Argument* end() const { return first_ + count_; }
    constexpr std::size_t size() const { return count_; }

private:
    const Argument* first_ = nullptr;
    std::size_t count_ = 0;
};

}  // namespace ctl
