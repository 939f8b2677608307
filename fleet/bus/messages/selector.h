/// Which hosts are meant: terms joined by commas, all of which must hold.
///
///   env=test        the label "env" has this value; * stands for any characters
///   env!=test       it has not, or there is no such label
///   env in (a,b)    it has one of these values
///   env notin (a,b) it has none of them, or there is no such label
///   env             there is such a label
///   !env            there is none
///   web-*           the host has this name: a term with * and no operator
///   *               every host
#pragma once

#include <map>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace fleet {

using Labels = std::map<std::string, std::string>;

/// What is wrong with a selector, for people.
class SelectorError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

class Selector {
public:
    /// Throws SelectorError. A selector without a term selects nothing and is an error, too: nobody
    /// shall reach every host by a text that was left empty.
    explicit Selector(std::string_view text);

    bool matches(const std::string& host, const Labels& labels) const;

private:
    struct Term {
        enum class Kind { IsOneOf, IsNoneOf, Exists, Missing, Name };
        Kind kind;
        std::string key;                  ///< a label's name, or the pattern of a host's
        std::vector<std::string> values;  ///< patterns
    };
    static Term termOf(std::string_view text);
    static bool holds(const Term& term, const std::string& host, const Labels& labels);

    std::vector<Term> terms_;
};

/// Whether a text is what a pattern describes, in which * stands for any characters. Takes time in
/// proportion to both lengths, whatever they hold.
bool fitsPattern(std::string_view pattern, std::string_view text);

}  // namespace fleet
