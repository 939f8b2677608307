/// The options of a fleet's verbs.
#pragma once

#include "ctl/verbs/arguments/argument.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/arguments/values.h"
#include "ctl/verbs/verb.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

inline constexpr ctl::Argument kFleet =
    ctl::textOption("--fleet", "The fleet's centre; without it $ZAV_FLEET").called("URL");
inline constexpr ctl::Argument kOn =
    ctl::textOption("--on",
                    "The hosts that are meant: terms joined by commas, all of which must\n"
                    "hold: k=v, k!=v, k in (a,b), k notin (a,b), k, !k, or a name with *;\n"
                    "or @FILE with a name on each line")
        .called("SELECTOR");
inline constexpr ctl::Argument kWaves =
    ctl::textOption("--waves", "How many hosts get their orders together, as 1,10%,50%,100%")
        .called("LIST");
inline constexpr ctl::Argument kMaxFailures =
    ctl::textOption("--max-failures", "More failures than that pause the roll-out: 5, or 2%")
        .called("SHARE");
inline constexpr ctl::Argument kPause =
    ctl::textOption("--pause", "Time between two waves, as 60s or 10m").called("TIME");
inline constexpr ctl::Argument kWait =
    ctl::textOption("--wait", "How long a wave may take before the next one begins").called("TIME");
inline constexpr ctl::Argument kParallel =
    ctl::numberOption("--parallel", "How many hosts of a wave work at the same time")
        .between(1, 1e6);
inline constexpr ctl::Argument kExpires =
    ctl::textOption("--expires", "How long an order is good for, at most 7d")
        .called("TIME")
        .otherwise("24h");
inline constexpr ctl::Argument kDryRun =
    ctl::flag("--dry-run", "Show the hosts and what they would get, and send nothing");
inline constexpr ctl::Argument kFleetTimeout =
    ctl::secondsOption("--timeout",
                       "How long to wait for an answer, a certificate or the end of a roll-out;\n"
                       "as long as it takes if not given")
        .between(0, 1e9);

inline constexpr ctl::Argument kFleetArgumentList[] = {
    kFleet,    kOn,      kWaves,  kMaxFailures, kPause,       kWait,
    kParallel, kExpires, kDryRun, ctl::kJson,   kFleetTimeout};
inline constexpr ctl::ArgumentList kFleetArguments = kFleetArgumentList;

/// The time that an option gives: a whole number with s, m, h or d behind it, or of seconds. Throws
/// ctl::Failure(kWrongUsage) for other texts, and for more than 365 days.
Moment timeOf(const ctl::Values& given, const ctl::Argument& option);

/// Throws ctl::Failure(kWrongUsage) for options that mean nothing to the verb, such as a plan for a
/// verb that changes no host.
void insistOnMeaning(const ctl::Verb& verb, const ctl::Values& given);

}  // namespace fleet
