/// A program's route table at work: finds the row of each request, and has it answered.
#pragma once

#include <memory>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "http/handler.h"
#include "routes/call.h"
#include "routes/route.h"
#include "routes/router.h"

namespace routes {

/// Immutable; any thread.
template <typename Services>
class RouteTable {
public:
    /// As Router's.
    RouteTable(std::vector<Route<Services>> rows, std::string readersRefusal)
        : rows_(std::move(rows)), router_(factsOf(rows_), std::move(readersRefusal)) {}

    /// What a request that fits no row is told; otherwise what `answer` makes of its row and its
    /// call, at once or as a job, as the row says where that runs. The job keeps a copy of
    /// `answer`, and is not to outlive this object. `answer` is called as http::Answer(const
    /// Route<Services>&, Call&).
    template <typename Answer>
    std::variant<http::Answer, http::Job> dispatch(http::Request request, Answer answer) const {
        std::variant<Match, http::Reply> found = router_.find(request);
        if (auto* const reply = std::get_if<http::Reply>(&found)) {
            return http::Answer(std::move(*reply));
        }
        const auto call =
            std::make_shared<Call>(std::get<Match>(std::move(found)), std::move(request));
        const Route<Services>& row = rows_[call->row()];
        if (row.runs == Runs::AtOnce) return answer(row, *call);
        return http::Job(
            [call, &row, answer = std::move(answer)]() mutable { return answer(row, *call); });
    }

    const Router& router() const { return router_; }

private:
    const std::vector<Route<Services>> rows_;
    const Router router_;
};

}  // namespace routes
