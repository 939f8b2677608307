/// Lends what the framework hands to a table when a request is made, to tests that call CreateRtoxa
/// themselves.
#pragma once

#include <functional>
#include <utility>
#include <vector>

#include "embedded/oxa_host.h"
#include "platform/oxa.h"

/// What a request is made of; both end with the call that lends them.
using UseOfRequest = std::function<void(RequestDetail* detail, ContextInfo* context)>;

namespace request_lender {

/// A table that makes no request of its own.
class Lender final : public TableManager {
public:
    explicit Lender(UseOfRequest use) : TableManager("TST", "LENDER"), use_(std::move(use)) {
        RegisterWithManager();
    }
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override {
        use_(detail, context);
        return nullptr;
    }

private:
    const UseOfRequest use_;
};

}  // namespace request_lender

/// Calls `use`, on this thread, with what a query with these conditions is made of.
inline void lendQuery(const std::vector<oxa::Predicate>& where, UseOfRequest use) {
    const request_lender::Lender lender(std::move(use));
    oxa::Rows none;
    oxa::query("LENDER", where, none);
}

/// The same for a subscription.
inline void lendSubscription(const std::vector<oxa::Predicate>& where, UseOfRequest use) {
    const request_lender::Lender lender(std::move(use));
    oxa::subscribe("LENDER", where, [](const oxa::Rows&) { return 0; });
}
