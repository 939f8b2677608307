#include "ctl/client/tasks/task_request.h"

#include <unistd.h>

#include <array>
#include <cstdio>
#include <nlohmann/json.hpp>
#include <random>
#include <utility>

using nlohmann::json;

namespace ctl {
namespace {

constexpr const char* kPrefix = "zavctl-";
constexpr std::size_t kRandomDigits = 16;

using Column = std::pair<const char*, const std::string*>;

std::array<Column, 9> columnsOf(const TaskRequest& request) {
    return {{{"COMMAND", &request.command},
             {"TRANSID", &request.transid},
             {"PRODUCT", &request.product},
             {"CONTEXT", &request.context},
             {"OPTIONAL", &request.optional},
             {"UACONFIG", &request.uaconfig},
             {"UASCRIPT", &request.uascript},
             {"VERSION", &request.version},
             {"TARGETMSN", &request.targetmsn}}};
}

std::string lowerCase(std::string name) {
    for (char& letter : name) {
        if (letter >= 'A' && letter <= 'Z') letter = static_cast<char>(letter - 'A' + 'a');
    }
    return name;
}

}  // namespace

std::vector<Condition> TaskRequest::conditions() const {
    std::vector<Condition> where;
    for (const auto& [column, value] : columnsOf(*this)) {
        if (!value->empty()) where.push_back({column, "=", *value});
    }
    return where;
}

TableQuery TaskRequest::query() const {
    return {kRequestTable, conditions(), isForced};
}

json TaskRequest::document() const {
    json document = json::object();
    for (const auto& [column, value] : columnsOf(*this)) {
        if (!value->empty()) document[lowerCase(column)] = *value;
    }
    if (isForced) document["force"] = true;
    if (isUnique || isOnce) document["once"] = true;
    return document;
}

std::string makeTransid() {
    std::random_device random;
    char text[80];
    std::snprintf(text, sizeof text, "%s%ld-%08x%08x", kPrefix, static_cast<long>(::getpid()),
                  random(), random());
    return text;
}

bool isMadeUp(const std::string& transid) {
    if (transid.rfind(kPrefix, 0) != 0) return false;
    const std::size_t dash = transid.rfind('-');
    return transid.size() - dash == kRandomDigits + 1 &&
           transid.find_first_not_of("0123456789abcdef", dash + 1) == std::string::npos;
}

}  // namespace ctl
