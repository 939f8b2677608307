/// What is said when the user ends the program with Ctrl-C.
#pragma once

#include <cstddef>
#include <string>

namespace ctl {

/// As long as an object exists, SIGINT prints its text, after those of the objects that were made
/// before it, and ends the program with kInterrupted at once. When the last one is gone, SIGINT
/// does again what it did before. For the thread of main() alone.
class InterruptNote {
public:
    /// `err` is for standard error, `out` for standard output; both are whole lines.
    explicit InterruptNote(std::string err, std::string out = {});
    ~InterruptNote();
    /// Says other lines from now on.
    void change(std::string err, std::string out);
    InterruptNote(const InterruptNote&) = delete;
    InterruptNote& operator=(const InterruptNote&) = delete;

private:
    std::size_t place_ = 0;  ///< among all notes
};

}  // namespace ctl
