/// Tracing for the functions of this library. One line at the start of a function creates its trace
/// block, which writes entry and exit events, and lines at detail or error level.
///
///     RAS1_UNIT traceUnit{"zavutil"};                       // once per source file
///
///     bool Util::pathExists(const String& path) {
///         Trace trace(traceUnit);
///         ...
///         trace().detail("Path [%s] exists", path);
///         return trace.exit(true);
///     }
///
/// Formats are printf's, but every argument knows its own type: a conversion that does not match
/// its argument still prints something sensible, and an unknown conversion is written literally.
/// Arguments are converted only when the line is enabled.
#pragma once

#include <initializer_list>
#include <string>
#include <type_traits>

#include "platform/ras1.h"

namespace ZAV {

class CharStar;
class String;

/// The text in the local code page. The text type lies above the trace and defines this; the
/// declaration is all that the trace knows of it.
std::string localText(const String& text);

/// One argument of a trace line. Borrows the value that it is made from.
class TraceArgument {
public:
    template <typename T, std::enable_if_t<std::is_integral_v<T> || std::is_enum_v<T>, int> = 0>
    TraceArgument(T value)
        : kind_(std::is_signed_v<T> || std::is_enum_v<T> ? Kind::Signed : Kind::Unsigned),
          number_(static_cast<long long>(value)) {}
    TraceArgument(const char* text) : kind_(Kind::Text), pointer_(text) {}
    TraceArgument(const std::string& text) : kind_(Kind::Text), pointer_(text.c_str()) {}
    TraceArgument(const void* pointer) : kind_(Kind::Pointer), pointer_(pointer) {}
    TraceArgument(const String& text) : kind_(Kind::Wide), pointer_(&text) {}
    TraceArgument(const CharStar& text);  ///< defined with CharStar

    /// Appends the argument to `out`, formatted by a conversion such as "%-5d" or "%.64s". A text
    /// is read up to its terminating 0 or the conversion's precision, whichever comes first.
    void format(const std::string& conversion, std::string& out) const;

    /// The same for a "%" that is followed by just this letter, where that is a matter of appending
    /// a text or a number, as in most lines. False, and nothing appended, if it is not.
    bool formatPlain(char letter, std::string& out) const;

private:
    enum class Kind { Signed, Unsigned, Text, Wide, Pointer };
    void formatText(const std::string& conversion, std::string& out) const;

    Kind kind_;
    union {
        long long number_;
        const void* pointer_;
    };
};

/// Formats the text of a trace line.
std::string formatTrace(const char* format, std::initializer_list<TraceArgument> arguments);

/// The trace block of one function call: the first local variable of the function.
class Trace {
public:
    explicit Trace(RAS1_UNIT& unit, const char* function = __builtin_FUNCTION(),
                   int line = __builtin_LINE())
        : block_{&unit, function}, flags_(RAS1_Flags(unit)), line_(line) {
        if ((flags_ & RAS1_FLOW) != 0) RAS1_Entry(&block_, line);
    }
    ~Trace() {
        if ((flags_ & RAS1_FLOW) != 0) writeExit();
    }
    Trace(const Trace&) = delete;
    Trace& operator=(const Trace&) = delete;

    /// Writes lines on behalf of one place in the source. When out of memory, it writes the format
    /// without its arguments.
    class Place {
    public:
        Place(const Trace& trace, int line) : trace_(trace), line_(line) {}

        template <typename... Arguments>
        void detail(const char* format, const Arguments&... arguments) const {
            if (trace_.detailed()) write(RAS1_DETAIL, format, {TraceArgument(arguments)...});
        }
        template <typename... Arguments>
        void error(const char* format, const Arguments&... arguments) const {
            if (trace_.erroneous()) write(RAS1_ERROR, format, {TraceArgument(arguments)...});
        }

    private:
        void write(unsigned level, const char* format,
                   std::initializer_list<TraceArgument> arguments) const noexcept;
        const Trace& trace_;
        int line_;
    };

    /// The place of the call, for a line: trace().error("...").
    Place operator()(int line = __builtin_LINE()) const { return Place(*this, line); }

    /// Records the function's result for the exit event, and returns it.
    template <typename T>
    T exit(T result, int line = __builtin_LINE()) {
        static_assert(std::is_integral_v<T> || std::is_enum_v<T>, "only numbers are traced");
        line_ = line;
        hasResult_ = true;
        result_ = static_cast<long>(result);
        return result;
    }

    /// Whether detail lines are enabled. Check this before computing something just for a trace.
    bool detailed() const { return (flags_ & RAS1_DETAIL) != 0; }
    bool erroneous() const { return (flags_ & RAS1_ERROR) != 0; }

    const RAS1_BLOCK& block() const { return block_; }

private:
    void writeExit() const;

    RAS1_BLOCK block_;
    unsigned flags_;
    int line_;
    bool hasResult_ = false;
    long result_ = 0;
};

}  // namespace ZAV
