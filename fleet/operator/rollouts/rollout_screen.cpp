#include "fleet/operator/rollouts/rollout_screen.h"

#include <unistd.h>

#include <cstdio>
#include <nlohmann/json.hpp>

#include "ctl/client/interruption.h"
#include "ctl/show/printable.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/rollouts/rollout_follower.h"
#include "fleet/operator/rollouts/rollout_page.h"

using ctl::Format;
using nlohmann::json;

namespace fleet {
namespace {

/// Counts on a terminal, on one line that is drawn anew; elsewhere a line for each wave.
class RolloutScreen {
public:
    explicit RolloutScreen(Format format)
        : isText_(format == Format::Text), isDrawn_(isText_ && ::isatty(STDERR_FILENO) == 1) {}
    ~RolloutScreen() { erase(); }
    RolloutScreen(const RolloutScreen&) = delete;
    RolloutScreen& operator=(const RolloutScreen&) = delete;

    void progress(const json& rollout) {
        if (!isText_) return;
        const std::uint64_t wave = memberNumber(rollout, "wave");
        const std::string waves = "wave " + std::to_string(wave) + " of " +
                                  std::to_string(memberList(rollout, "waves").size()) + ", ";
        const std::string text = (wave == 0 ? "" : waves) + progressText(rollout);
        if (isDrawn_) {
            std::fprintf(stderr, "\r%s\033[K", text.c_str());
            std::fflush(stderr);
            hasLine_ = true;
        } else if (wave != wave_) {
            ctl::print({text + "\n", {}});
        }
        wave_ = wave;
    }
    void failure(const json& part) {
        if (isText_) show({failureText(part) + "\n", {}});
    }
    void note(const std::string& text) { show({{}, ctl::complaint("note: " + text)}); }
    ctl::ExitStatus show(const ctl::Page& page) {
        erase();
        return ctl::print(page);
    }

private:
    void erase() {
        if (!hasLine_) return;
        std::fputs("\r\033[K", stderr);
        std::fflush(stderr);
        hasLine_ = false;
    }

    const bool isText_;
    const bool isDrawn_;
    bool hasLine_ = false;
    std::uint64_t wave_ = 0;
};

ctl::Page goesOnWithout(const std::string& id, Format format) {
    return ctl::failurePage(
        {ctl::kInterrupted, "interrupted; the roll-out " + id + " goes on",
         "zavctl rollout watch " + id + " takes it up again, and rollout abort " + id + " ends it"},
        format);
}

}  // namespace

ctl::ExitStatus watchRollout(Centre& centre, const std::string& id, ctl::Deadline deadline,
                             Format format) {
    const ctl::Page interrupted = goesOnWithout(ctl::printable(id), format);
    const ctl::InterruptNote note(interrupted.err, interrupted.out);
    RolloutScreen screen(format);
    RolloutEvents events;
    events.onLook = [&](const json& rollout) { screen.progress(rollout); };
    events.onFailure = [&](const json& part) { screen.failure(part); };
    events.onNote = [&](const std::string& text) { screen.note(text); };
    const RolloutEnd end = followRollout(centre, id, deadline, events);
    return screen.show(showEnd(end.rollout, end.failures, format));
}

}  // namespace fleet
