/// Captures what the library traces while it exists, in this process and its children.
#pragma once

#include <string>
#include <vector>

#include "support/scratch_dir.h"

struct TraceLine {
    char level = '?';  ///< 'E' error, 'D' detail, 'F' entry or exit
    std::string unit;
    int line = 0;
    std::string function;
    std::string text;  ///< with line ends as they were passed, the trailing ones dropped
};

class TraceCapture {
public:
    /// `selection` has the form of KBB_RAS1.
    explicit TraceCapture(const std::string& selection = "ALL");
    ~TraceCapture();

    std::vector<TraceLine> lines() const;
    /// The texts of one level, in order, of all units or one.
    std::vector<std::string> errors(const std::string& unit = "") const;
    std::vector<std::string> details(const std::string& unit = "") const;
    /// How often exactly this text was written at that level.
    int count(char level, const std::string& text) const;
    void clear();

private:
    std::vector<std::string> texts(char level, const std::string& unit) const;
    ScratchDir scratch_;
};
