#include "ctl/verbs/tasks/waiting.h"

#include <utility>

#include "ctl/client/failure.h"
#include "ctl/show/shell_quoted.h"
#include "ctl/show/tasks/task_page.h"
#include "ctl/verbs/arguments/global_arguments.h"

namespace ctl {
namespace {

Page notAcceptedYet(const std::string& transid, Format format) {
    return failurePage(
        {kInterrupted, "interrupted before the host had accepted the request (" + transid + ")",
         "zavctl task show " + shellQuoted(transid) + " tells whether it has now"},
        format);
}

Page goesOn(const std::string& id, const std::string& transid, Format format) {
    return failurePage(
        {kInterrupted, "interrupted; the host goes on with task " + id + " (" + transid + ")",
         "zavctl task wait " + shellQuoted(id) + " waits for its outcome"},
        format);
}

}  // namespace

InterruptNote interruptNote(const std::string& transid, Format format) {
    const Failure interrupted(kInterrupted, "interrupted; the host goes on with task " + transid,
                              laterText(transid));
    const Page page = failurePage(interrupted, format);
    return InterruptNote(page.err, page.out);
}

Waiting::Waiting(const Invocation& invocation, const std::string& title, std::string transid)
    : format_(invocation.format),
      isVerbose_(invocation.given.flag(kVerbose)),
      transid_(std::move(transid)),
      clock_(title, invocation.format == Format::Text),
      output_(format_),
      note_(notAcceptedYet(transid_, format_).err, notAcceptedYet(transid_, format_).out) {}

TaskWatch Waiting::watch() {
    TaskWatch watch;
    watch.tick = [this] {
        if (!hasOutput_) clock_.tick();
    };
    watch.onAccepted = [this](const std::string& id) { accepted(id); };
    watch.onNote = [this](const std::string& text) { show({{}, complaint("note: " + text)}); };
    if (isVerbose_) {
        watch.onOutput = [this](const std::string& stream, const std::string& text) {
            showOutput(stream, text);
        };
    }
    return watch;
}

void Waiting::show(const Page& page) {
    clock_.erase();
    print(page);
}

void Waiting::accepted(const std::string& id) {
    const Page page = goesOn(id, transid_, format_);
    note_.change(page.err, page.out);
}

void Waiting::showOutput(const std::string& stream, const std::string& text) {
    hasOutput_ = true;
    show(output_.next(stream, text));
}

}  // namespace ctl
