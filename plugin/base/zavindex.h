#pragma once

namespace ZAV {

/// Thrown by String and Array for a position out of range. It stores its text in place, so throwing
/// and copying it needs no memory.
class IndexOutOfBoundsException {
public:
    /// `line` is the line of the throwing statement, `file` its source unit.
    IndexOutOfBoundsException(int line, const char* file);
    ~IndexOutOfBoundsException() {}
    IndexOutOfBoundsException(const IndexOutOfBoundsException&) = default;
    IndexOutOfBoundsException& operator=(const IndexOutOfBoundsException&) = default;

    /// "line: %d, file: %s"; valid as long as the exception.
    const char* getErrorMessage() const { return message_; }

private:
    char message_[512];
};

}  // namespace ZAV
