/// One condition of a query.
#pragma once

#include <string>

namespace ctl {

struct Condition {
    std::string column;
    std::string op;  ///< =, !=, <, <=, >, >= or like
    std::string value;
};

}  // namespace ctl
