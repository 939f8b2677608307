/// Roll-outs as people read them.
#pragma once

#include <chrono>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace fleet {

/// "START ux": what each host is to do.
std::string workText(const nlohmann::json& rollout);

/// One line without a line end: "12 of 100 over: 10 done, 2 failed; 3 under way; 85 waiting".
std::string progressText(const nlohmann::json& rollout);

/// "web-7: failed, the agent did not start": how it ended on one host.
std::string failureText(const nlohmann::json& part);

/// Whether nothing of it goes on by itself: it is finished, aborted or paused.
bool isOver(const nlohmann::json& rollout);
/// Whether all of its hosts have done what they were to do.
bool isAllDone(const nlohmann::json& rollout);

/// What a roll-out has come to, for who has waited for it; its status is the program's. As JSON it
/// is {"rollout": ..., "failures": [...]}.
ctl::Page showEnd(const nlohmann::json& rollout, const nlohmann::json& failures,
                  ctl::Format format);

/// Everything about one; `failures` are parts of it.
ctl::Page showRollout(const nlohmann::json& rollout, const nlohmann::json& failures,
                      ctl::WallTime now, ctl::Format format);

/// A line for each of an answer {"rollouts": [...]}.
ctl::Page showRollouts(const nlohmann::json& answer, ctl::WallTime now, ctl::Format format);

}  // namespace fleet
