#pragma once

namespace ZAV {

/// Thrown by String and Array on a bad position. A plain value that carries its text with it, so
/// that throwing and copying it needs no memory.
class IndexOutOfBoundsException {
public:
    /// `line` is the line of the throwing statement, `file` the source unit it stands in.
    IndexOutOfBoundsException(int line, const char* file);
    ~IndexOutOfBoundsException() {}
    IndexOutOfBoundsException(const IndexOutOfBoundsException&) = default;
    IndexOutOfBoundsException& operator=(const IndexOutOfBoundsException&) = default;

    /// "line: %d, file: %s"; lives as long as the exception.
    const char* getErrorMessage() const { return message_; }

private:
    char message_[512];
};

}  // namespace ZAV
