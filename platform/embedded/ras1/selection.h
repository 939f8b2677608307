/// Which source units trace what.
#pragma once

#include <string>
#include <vector>

namespace ras1 {

/// A level for all units and exceptions by the beginning of a unit's name; the first that fits
/// counts.
struct Selection {
    struct Rule {
        std::string unitPrefix;
        unsigned flags;
    };
    unsigned general;
    std::vector<Rule> rules;

    unsigned flagsOf(const char* unit) const;
};

/// Understands "ALL" or "ERROR (UNIT:zavtasks ALL) (UNIT:zavu DETAIL)"; words and groups that say
/// nothing are passed over, and without a general level errors are traced.
Selection parseSelection(const std::string& text);

}  // namespace ras1
