/// Rules: what one operation of the seam promises, each as a function that looks whether it is so.
#pragma once

#include <functional>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include "conformance/driver.h"

namespace conformance {

/// Thrown by a rule that finds its promise broken.
class Unfulfilled : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// What a rule works with; made for each rule anew, in the rule's own process.
class Bench {
public:
    /// `scratch` is an empty directory for this rule alone.
    explicit Bench(std::string scratch) : scratch_(std::move(scratch)) {}

    const std::string& scratch() const { return scratch_; }
    /// The driver, made when it is first asked for.
    Driver& driver();

private:
    const std::string scratch_;
    std::unique_ptr<Driver> driver_;
};

struct Rule {
    std::string promise;  ///< completes a sentence that begins with the operation's name
    std::function<void(Bench&)> check;
};

struct Operation {
    std::string name;
    std::vector<Rule> rules;
};

/// A value as a report shows it.
template <typename Value>
std::string shown(const Value& value) {
    std::ostringstream text;
    text << value;
    return text.str();
}
/// Texts are quoted, cut to a readable length, and bytes that do not print are written as numbers.
std::string shown(const std::string& text);
std::string shown(const char* text);
std::string shown(std::nullptr_t);
std::string shown(bool value);
template <typename Value>
std::string shown(const std::vector<Value>& values) {
    std::string text;
    for (const Value& value : values)
        text += (text.empty() ? "" : ", ") + shown(value);
    return "{" + text + "}";
}

/// Throws Unfulfilled with `what` unless the condition holds.
void require(bool holds, const std::string& what);

/// Throws Unfulfilled unless the two are equal; `what` names what was looked at.
template <typename Actual, typename Expected>
void requireEqual(const Actual& actual, const Expected& expected, const std::string& what) {
    if (actual == expected) return;
    throw Unfulfilled(what + " is " + shown(actual) + " instead of " + shown(expected));
}

/// The operations of each of the seam's headers.
std::vector<Operation> bss1Operations();
std::vector<Operation> fsi1Operations();
std::vector<Operation> nls2Operations();
std::vector<Operation> xml1Operations();
std::vector<Operation> ras1Operations();
std::vector<Operation> oxaComparisonOperations();
std::vector<Operation> oxaRequestOperations();
std::vector<Operation> oxaManagerOperations();
std::vector<Operation> ncsOperations();

/// All of them.
std::vector<Operation> allOperations();

}  // namespace conformance
