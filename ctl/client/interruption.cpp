#include "ctl/client/interruption.h"

#include <signal.h>
#include <unistd.h>

#include <utility>
#include <vector>

#include "ctl/client/failure.h"

namespace ctl {
namespace {

struct Texts {
    std::string err;
    std::string out;
};

std::vector<Texts> notes;
/// All notes in one, which the handler writes. It changes only while SIGINT is held back.
Texts whole;
struct sigaction before;

void writeAll(int descriptor, const std::string& text) {
    const char* at = text.data();
    const char* const end = at + text.size();
    while (at < end) {
        const ssize_t length = ::write(descriptor, at, static_cast<std::size_t>(end - at));
        if (length <= 0) return;
        at += length;
    }
}

/// Makes only async-signal-safe calls: the texts stand ready.
void endInterrupted(int) {
    writeAll(STDOUT_FILENO, whole.out);
    writeAll(STDERR_FILENO, whole.err);
    ::_exit(kInterrupted);
}

/// Runs a change of the notes while no signal can come.
template <typename Change>
void changeNotes(Change change) {
    sigset_t interrupt;
    sigset_t mask;
    ::sigemptyset(&interrupt);
    ::sigaddset(&interrupt, SIGINT);
    ::sigprocmask(SIG_BLOCK, &interrupt, &mask);
    change();
    whole = {};
    // A clock may stand on the terminal's line.
    if (::isatty(STDERR_FILENO) == 1) whole.err = "\r\x1b[K";
    for (const Texts& note : notes) {
        whole.err += note.err;
        whole.out += note.out;
    }
    ::sigprocmask(SIG_SETMASK, &mask, nullptr);
}

}  // namespace

InterruptNote::InterruptNote(std::string err, std::string out) {
    changeNotes([&] {
        place_ = notes.size();
        notes.push_back({std::move(err), std::move(out)});
        if (notes.size() > 1) return;
        struct sigaction action {};
        action.sa_handler = endInterrupted;
        ::sigaction(SIGINT, &action, &before);
        // A SIGINT that was ignored when the program started stays ignored: a shell does that for
        // a command in the background.
        if (before.sa_handler == SIG_IGN) ::sigaction(SIGINT, &before, nullptr);
    });
}

void InterruptNote::change(std::string err, std::string out) {
    changeNotes([&] { notes[place_] = {std::move(err), std::move(out)}; });
}

InterruptNote::~InterruptNote() {
    changeNotes([] {
        notes.pop_back();
        if (notes.empty()) ::sigaction(SIGINT, &before, nullptr);
    });
}

}  // namespace ctl
