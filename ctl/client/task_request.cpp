#include "ctl/client/task_request.h"

#include <unistd.h>

#include <cstdio>
#include <random>
#include <utility>

namespace ctl {

std::vector<Condition> TaskRequest::conditions() const {
    const std::pair<const char*, const std::string*> columns[] = {
        {"COMMAND", &command},   {"TRANSID", &transid},   {"PRODUCT", &product},
        {"CONTEXT", &context},   {"OPTIONAL", &optional}, {"UACONFIG", &uaconfig},
        {"UASCRIPT", &uascript}, {"VERSION", &version},   {"TARGETMSN", &targetmsn},
    };
    std::vector<Condition> where;
    for (const auto& [column, value] : columns) {
        if (!value->empty()) where.push_back({column, "=", *value});
    }
    return where;
}

TableQuery TaskRequest::query() const {
    return {kRequestTable, conditions(), isForced};
}

std::string makeTransid() {
    std::random_device random;
    char text[80];
    std::snprintf(text, sizeof text, "zavctl-%ld-%08x%08x", static_cast<long>(::getpid()), random(),
                  random());
    return text;
}

}  // namespace ctl
