/// Arguments that several verbs have in common.
#pragma once

#include "ctl/verbs/arguments/argument.h"

namespace ctl {

constexpr Argument kProduct =
    positional("PRODUCT", "Product code").required().completedBy(Completion::Product);
constexpr Argument kTarget =
    textOption("--target", "Managed system name of the instance").completedBy(Completion::Instance);

// Of the commands that the host queues.
constexpr Argument kNoWait = flag("--no-wait", "Do not wait for the outcome");
constexpr Argument kTransid = textOption("--transid", "The transaction identifier to use")
                                  .completedBy(Completion::Transaction);
constexpr Argument kOnce =
    textOption("--once",
               "A transaction identifier that makes a repetition harmless: it shows what\n"
               "became of the first request, and does nothing")
        .called("KEY")
        .without("--transid")
        .completedBy(Completion::Transaction);
constexpr Argument kForce =
    flag("--force", "Send it although the inventory does not list the product");
constexpr Argument kNoVerify =
    flag("--no-verify", "Do not look afterwards whether a success is one");

}  // namespace ctl
