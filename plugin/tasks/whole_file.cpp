#include "tasks/whole_file.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "base/file_descriptor.h"
#include "base/zavtrace.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

constexpr std::size_t kChunk = 1024;

/// A stream that is closed when it goes out of scope, if not before.
using Stream = std::unique_ptr<std::FILE, int (*)(std::FILE*)>;

Stream openText(const String& path, const char* mode) {
    return Stream(ZAV::openStream(path.c_str(), mode), &std::fclose);
}

bool closeStream(Stream& stream, const String& path, const Trace& trace) {
    if (std::fclose(stream.release()) == 0) return true;
    trace().error("Failed to close stream for file %s", path);
    return false;
}

/// The text up to its first 0 as bytes of the local code page. String::c_str has room for only one
/// byte per unit and would truncate a text with characters of several bytes. Such a text is
/// converted with zeros appended, which make room for all of it.
std::string allBytes(const String& text) {
    constexpr std::size_t kMostBytesPerUnit = 4;
    const unsigned short* const begin = text.getData();
    const unsigned short* const end = std::find(begin, begin + text.length(), 0);
    if (std::all_of(begin, end, [](unsigned short unit) { return unit < 0x80; })) {
        return std::string(begin, end);
    }
    const auto count = static_cast<std::size_t>(end - begin);
    std::vector<unsigned short> units(count * kMostBytesPerUnit, 0);
    std::copy(begin, end, units.begin());
    String padded;
    padded.assign(units.data(), static_cast<std::uint32_t>(units.size()));
    return std::string(static_cast<const char*>(padded.c_str()));
}

/// Reads to the end of the stream. When a read returns data and an error, drops everything; an
/// error without data counts as the end.
std::string readAll(std::FILE* stream, const String& path, const Trace& trace) {
    std::string bytes;
    char chunk[kChunk];
    std::clearerr(stream);
    while (const std::size_t count = std::fread(chunk, 1, kChunk, stream)) {
        if (const int error = std::ferror(stream)) {
            trace().error("Error reading from file %s, error is %d", path, error);
            return {};
        }
        bytes.append(chunk, count);
        std::clearerr(stream);
    }
    return bytes;
}

/// A write that takes nothing ends the loop but is not reported as a failure here: closing the
/// stream reports it.
bool writeAll(std::FILE* stream, const std::string& bytes, const String& path, const Trace& trace) {
    const char* next = bytes.c_str();
    const char* const end = next + bytes.size();
    std::clearerr(stream);
    while (const std::size_t count =
               std::fwrite(next, 1, static_cast<std::size_t>(end - next), stream)) {
        if (const int error = std::ferror(stream)) {
            trace().error("Error writing to file %s, error code: %s", path, std::strerror(error));
            return false;
        }
        std::clearerr(stream);
        next += count;
        if (next == end) break;
    }
    return true;
}

}  // namespace

String readFile(String path) {
    Trace trace(traceUnit);
    Stream stream = openText(path, "rb");
    if (stream == nullptr) {
        trace().error("Failed to open file %s using mode \"%s\", check permissions", path, "rb");
        return {};
    }
    std::string bytes = readAll(stream.get(), path, trace);
    closeStream(stream, path, trace);
    bytes.erase(std::remove(bytes.begin(), bytes.end(), '\0'), bytes.end());
    return String(bytes.c_str());
}

int writeFile(const String& path, const String& text) {
    Trace trace(traceUnit);
    Stream stream = openText(path, "wb");
    if (stream == nullptr) {
        // Not the mode that is used: readers of the traces know the message in this form.
        trace().error("Failed to open file %s using mode \"%s\", check permissions", path, "rb");
        return trace.exit(0);
    }
    const bool written = writeAll(stream.get(), allBytes(text), path, trace);
    const bool closed = closeStream(stream, path, trace);
    return trace.exit(written && closed ? 1 : 0);
}

int deleteFile(String path) {
    Trace trace(traceUnit);
    if (::unlink(path.c_str()) != 0) {
        trace().error("Failed to delete file %s error was: %s", path, std::strerror(errno));
        return trace.exit(0);
    }
    trace().detail("Successfully deleted file %s", path);
    return trace.exit(1);
}

int getDirectoryFromPath(const String& path, String& dir) {
    Trace trace(traceUnit);
    // rfind skips the first character, so there is text before any separator that it finds.
    const std::uint32_t separator = path.rfind('/');
    if (separator == String::NPOS) {
        trace().error("Directory [%s] cannot be parsed, no dir separator", path);
        return trace.exit(0);
    }
    dir = path.substr(0, separator);
    return trace.exit(1);
}

String getFilenameFromPath(const String& path) {
    Trace trace(traceUnit);
    const std::uint32_t separator = path.rfind('/');
    if (separator == String::NPOS) return path;
    if (separator + 1 == path.length()) return {};
    return path.substr(separator + 1);
}

void removeChar(String& s, char c) {
    Trace trace(traceUnit);
    const unsigned short unwanted = static_cast<unsigned char>(c);
    std::vector<unsigned short> kept(s.getData(), s.getData() + s.length());
    kept.erase(std::remove(kept.begin(), kept.end(), unwanted), kept.end());
    s.assign(kept.data(), static_cast<std::uint32_t>(kept.size()));
}
