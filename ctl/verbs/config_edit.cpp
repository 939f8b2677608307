#include "ctl/verbs/config_edit.h"

#include <unistd.h>

#include <cstdlib>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/row.h"
#include "ctl/client/whole_file.h"
#include "ctl/show/task_page.h"
#include "ctl/verbs/common_arguments.h"
#include "ctl/verbs/config_get.h"
#include "ctl/verbs/config_set.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/queued.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kProduct, kTarget};

/// A file for the editor, removed again whatever happens.
class EditedFile {
public:
    explicit EditedFile(const std::string& content) {
        const char* const dir = std::getenv("TMPDIR");
        path_ = std::string(dir != nullptr && *dir != '\0' ? dir : "/tmp") + "/zavctl.XXXXXX";
        const int descriptor = ::mkstemp(path_.data());
        if (descriptor == -1) throw Failure(kWrongUsage, "cannot make a file for the editor");
        const bool written = writeDescriptor(descriptor, content);
        ::close(descriptor);
        if (written) return;
        ::unlink(path_.c_str());
        throw Failure(kWrongUsage, "cannot write " + path_);
    }
    ~EditedFile() { ::unlink(path_.c_str()); }
    EditedFile(const EditedFile&) = delete;
    EditedFile& operator=(const EditedFile&) = delete;

    /// The text as the editor leaves it.
    std::string edit() const {
        const char* editor = std::getenv("EDITOR");
        if (editor == nullptr || *editor == '\0') editor = "vi";
        // The variable may hold a command with arguments, so a shell takes it apart.
        const std::string command = std::string(editor) + " '" + path_ + "'";
        if (std::system(command.c_str()) != 0) {
            throw Failure(kWrongUsage, std::string("the editor ") + editor + " failed");
        }
        return readFile(path_);
    }

private:
    std::string path_;
};

ExitStatus run(const Invocation& invocation) {
    const std::string& product = invocation.given.text(kProduct);
    const std::string& target = invocation.given.text(kTarget);
    const json row = askConfiguration(invocation.host, invocation.format, product, target);
    if (returnCodeOf(row) != 0) return print(showNoConfiguration("config edit " + product, row));
    std::string before = textOf(row, "CONTEXT");
    if (before.empty() || before.back() != '\n') before += '\n';
    const std::string after = EditedFile(before).edit();
    if (after == before) return print(showUnchanged(product, row, invocation.format));
    const std::string title = "config set " + product;
    const TaskResult result = askQueued(invocation.host, invocation.format,
                                        configurationRequest(product, target, after), title, true);
    return print(showTask(title, result, invocation.format));
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
