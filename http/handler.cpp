#include "http/handler.h"

namespace http {

BodyPlan Handler::planFor(const Request&) {
    return {};
}

const std::vector<std::string>& Handler::wantedFields() const {
    static const std::vector<std::string> kNone;
    return kNone;
}

const Fields& Handler::commonFields() const {
    static const Fields kNoFields;
    return kNoFields;
}

}  // namespace http
