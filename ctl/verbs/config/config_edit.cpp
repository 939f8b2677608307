#include "ctl/verbs/config/config_edit.h"

#include <unistd.h>

#include <cstdlib>
#include <nlohmann/json.hpp>
#include <optional>

#include "ctl/client/failure.h"
#include "ctl/client/guarded.h"
#include "ctl/client/interruption.h"
#include "ctl/client/row.h"
#include "ctl/client/whole_file.h"
#include "ctl/show/tasks/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/config/config_get.h"
#include "ctl/verbs/config/config_set.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kProduct, kTarget};

/// A file for the editor. It is removed again unless what is in it must not be lost.
class EditedFile {
public:
    explicit EditedFile(const std::string& content) : original_(content) {
        const char* const dir = std::getenv("TMPDIR");
        path_ = std::string(dir != nullptr && *dir != '\0' ? dir : "/tmp") + "/zavctl.XXXXXX";
        const int descriptor = ::mkstemp(path_.data());
        if (descriptor == -1) throw Failure(kWrongUsage, "cannot make a file for the editor");
        const bool written = writeDescriptor(descriptor, content);
        ::close(descriptor);
        if (written) {
            note_.emplace(complaint(keptText()));
            return;
        }
        ::unlink(path_.c_str());
        throw Failure(kWrongUsage, "cannot write " + path_);
    }
    ~EditedFile() {
        if (!isKept_) ::unlink(path_.c_str());
    }
    EditedFile(const EditedFile&) = delete;
    EditedFile& operator=(const EditedFile&) = delete;

    /// Leaves the file where it is, and says so.
    std::string keep() {
        isKept_ = true;
        return keptText();
    }

    /// The text as the editor leaves it. After an editor that fails, a changed text is kept.
    std::string edit() {
        const char* editor = std::getenv("EDITOR");
        if (editor == nullptr || *editor == '\0') editor = "vi";
        // The variable may hold a command with arguments, so a shell takes it apart.
        const std::string command = std::string(editor) + " '" + path_ + "'";
        if (std::system(command.c_str()) != 0) {
            const bool isChanged = readFile(path_) != original_;
            throw Failure(kWrongUsage, std::string("the editor ") + editor + " failed",
                          isChanged ? keep() : std::string());
        }
        return readFile(path_);
    }

private:
    std::string keptText() const { return "your text is kept in " + path_; }

    std::string path_;
    std::string original_;
    std::optional<InterruptNote> note_;
    bool isKept_ = false;
};

/// A text that is cut would be written back cut.
void refuseCut(const std::string& product, const Configuration& configuration) {
    if (configuration.isWhole) return;
    throw Failure(
        kHostReportedFailure,
        "config edit " + product + ": the host gives no more than " +
            std::to_string(configuration.text.size()) +
            " bytes of the configuration as text, so the rest would be lost",
        "Write the whole text to a file and use: zavctl config set " + product + " --file FILE");
}

/// The failure with a hint that says where the text is.
Failure keeping(EditedFile& file, const Failure& failure) {
    const std::string hint = failure.hint().empty() ? "" : failure.hint() + "; ";
    return {failure.status(), failure.what(), hint + file.keep(), failure.guard()};
}

/// What somebody else has set while the editor was open would be lost without a word. Between this
/// look and the change is a moment that no request of the host's closes.
void refuseIfChanged(const Invocation& invocation, const std::string& product,
                     const Configuration& before) {
    if (!isGuarded(invocation.host, invocation.deadline())) return;
    const Configuration now = askConfiguration(invocation.host, invocation.format, product,
                                               invocation.given.text(kTarget));
    if (returnCodeOf(now.row) == 0 && now.text == before.text) return;
    throw Failure(kHostReportedFailure,
                  "config edit " + product +
                      ": the configuration has changed on the host while it was edited",
                  "zavctl config get " + product + " shows it as it is now");
}

/// Sends the new text; keeps it where it is unless the host has taken it.
ExitStatus send(const Invocation& invocation, const TaskRequest& request, EditedFile& file) {
    const QueuedCommand command{request, "config edit " + request.product};
    try {
        const TaskResult result =
            askQueued(invocation, command, replyShown(command.title, invocation.format));
        Page page = showTask(command.title, result, invocation.format);
        if (page.status != kSuccess) page.err += complaint(file.keep());
        return print(page);
    } catch (const Failure& failure) {
        throw keeping(file, failure);
    }
}

ExitStatus run(const Invocation& invocation) {
    const std::string& product = invocation.given.text(kProduct);
    const std::string& target = invocation.given.text(kTarget);
    const Configuration configuration =
        askConfiguration(invocation.host, invocation.format, product, target);
    const json& row = configuration.row;
    if (returnCodeOf(row) != 0) {
        return print(showNoConfiguration("config edit " + product, configuration));
    }
    refuseCut(product, configuration);
    std::string before = configuration.text;
    if (before.empty() || before.back() != '\n') before += '\n';
    EditedFile file(before);
    const std::string after = file.edit();
    if (after == before) return print(showUnchanged(product, row, invocation.format));
    try {
        refuseIfChanged(invocation, product, configuration);
    } catch (const Failure& failure) {
        throw keeping(file, failure);
    }
    return send(invocation, configurationRequest(product, target, after), file);
}

}  // namespace

constexpr Verb kConfigEditVerb = {
    "config edit",
    "Change a configuration in $EDITOR",
    kArguments,
    {"zavctl config edit ux", "EDITOR=nano zavctl config edit ux --target db1:myhost:UX"},
    run,
};

Page showUnchanged(const std::string& product, const json& row, Format format) {
    if (format == Format::Json) return jsonPage({{"reply", row}, {"events", json::array()}});
    return {"config edit " + product + ": nothing changed\n", {}};
}

}  // namespace ctl
