/// Selects what each source unit traces.
#pragma once

#include <string>
#include <vector>

namespace ras1 {

/// A general level, and rules for units whose names have a prefix. The first rule that matches
/// applies.
struct Selection {
    struct Rule {
        std::string unitPrefix;
        unsigned flags;
    };
    unsigned general;
    std::vector<Rule> rules;

    unsigned flagsOf(const char* unit) const;
};

/// Parses texts such as "ALL" or "ERROR (UNIT:zavtasks ALL) (UNIT:zavu DETAIL)". Ignores words and
/// groups that it does not know. The general level is ERROR unless the text gives one.
Selection parseSelection(const std::string& text);

}  // namespace ras1
