#include "fleet/operator/rollouts/rollout_follower.h"

#include <optional>
#include <thread>

#include "ctl/client/failure.h"
#include "ctl/client/http/percent_encoding.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/rollouts/rollout_page.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::chrono::milliseconds kLookPause{1000};
/// While the centre does not answer.
constexpr std::chrono::milliseconds kAwayPause{5000};
constexpr std::size_t kFailuresOfOneLook = 1000;

std::string targetOf(const std::string& id) {
    return "/v1/rollouts/" + ctl::percentEncoded(id);
}

class RolloutFollower {
public:
    RolloutFollower(Centre& centre, std::string id, const RolloutEvents& events)
        : centre_(centre), id_(std::move(id)), events_(events) {}

    RolloutEnd follow(ctl::Deadline deadline) {
        for (;;) {
            const std::optional<json> rollout = look();
            if (rollout && isOver(*rollout)) return {*rollout, failures_};
            if (std::chrono::steady_clock::now() >= deadline) throw tooLate();
            pause(rollout ? kLookPause : kAwayPause);
        }
    }

private:
    /// Nothing while the centre does not answer.
    std::optional<json> look() {
        try {
            json rollout = centre_.get(targetOf(id_));
            if (memberText(rollout, "state").empty()) throw senseless("it tells no state");
            tellFailures(rollout);
            if (events_.onLook) events_.onLook(rollout);
            hasAnswered_ = true;
            isAway_ = false;
            return rollout;
        } catch (const ctl::Failure& failure) {
            const bool mayPass =
                failure.status() == ctl::kNoHost || failure.status() == ctl::kNoOutcome;
            if (!hasAnswered_ || !mayPass) throw;
            if (!isAway_ && events_.onNote) {
                events_.onNote(std::string(failure.what()) + "; asking again and again");
            }
            isAway_ = true;
            return std::nullopt;
        }
    }

    void tellFailures(const json& rollout) {
        const std::uint64_t seen = memberNumber(rollout, "failures");
        if (seen == seen_) return;
        for (const json& part : failuresOf(centre_, id_, kFailuresOfOneLook)) {
            // A host may fail again with another order.
            if (!told_.insert(memberText(part, "order")).second) continue;
            failures_.push_back(part);
            if (events_.onFailure) events_.onFailure(part);
        }
        seen_ = seen;
    }

    void pause(std::chrono::milliseconds time) const {
        if (events_.pause)
            events_.pause(time);
        else
            std::this_thread::sleep_for(time);
    }

    ctl::Failure tooLate() const {
        return {ctl::kNoOutcome, "the roll-out has not ended within the time-out; it goes on",
                "zavctl rollout watch " + id_ + " takes it up again"};
    }

    Centre& centre_;
    const std::string id_;
    const RolloutEvents& events_;
    json failures_ = json::array();
    std::set<std::string> told_;
    std::uint64_t seen_ = 0;
    bool hasAnswered_ = false;
    bool isAway_ = false;
};

}  // namespace

json failuresOf(Centre& centre, const std::string& id, std::size_t most) {
    return memberList(centre.get(targetOf(id) + "/failures?limit=" + std::to_string(most)),
                      "hosts");
}

RolloutEnd followRollout(Centre& centre, const std::string& id, ctl::Deadline deadline,
                         const RolloutEvents& events) {
    return RolloutFollower(centre, id, events).follow(deadline);
}

}  // namespace fleet
