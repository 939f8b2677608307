#include "host/checks/xml_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <memory>
#include <system_error>

#include "host/process/file_descriptor.h"
#include "platform/xml1.h"

namespace host {
namespace {

constexpr int kPiece = 16 * 1024;
constexpr std::size_t kLargest = std::size_t{16} << 20;

void countStart(void* depth, const char*, const char**) {
    ++*static_cast<long*>(depth);
}

void countEnd(void* depth, const char*) {
    --*static_cast<long*>(depth);
}

using Parser = std::unique_ptr<XML1_PARSER, decltype(&XML1_ParserFree)>;

std::string parseFault(XML1_PARSER* parser) {
    const char* const text = XML1_ErrorString(XML1_GetErrorCode(parser));
    return std::string("it does not parse: ") + (text == nullptr ? "unknown error" : text) +
           " in line " + std::to_string(XML1_GetCurrentLineNumber(parser));
}

std::string parse(const FileDescriptor& file, XML1_PARSER* parser) {
    for (std::size_t total = 0; total <= kLargest;) {
        void* const piece = XML1_GetBuffer(parser, kPiece);
        if (piece == nullptr) return "it cannot be parsed for want of memory";
        const ssize_t length = ::read(file.get(), piece, kPiece);
        if (length < 0 && errno == EINTR) continue;
        if (length < 0) return "it cannot be read: " + std::generic_category().message(errno);
        if (XML1_ParseBuffer(parser, static_cast<int>(length), length == 0 ? 1 : 0) == 0) {
            return parseFault(parser);
        }
        if (length == 0) return "";
        total += static_cast<std::size_t>(length);
    }
    return "it is too large";
}

}  // namespace

std::string xmlFaultOf(const std::string& path) {
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (!file) return "it cannot be read: " + std::generic_category().message(errno);
    struct stat found {};
    if (::fstat(file.get(), &found) != 0 || !S_ISREG(found.st_mode)) return "it is not a file";
    const Parser parser(XML1_ParserCreate(nullptr), &XML1_ParserFree);
    if (parser == nullptr) return "it cannot be parsed for want of memory";
    long depth = 0;
    XML1_SetUserData(parser.get(), &depth);
    XML1_SetElementHandler(parser.get(), countStart, countEnd);
    const std::string fault = parse(file, parser.get());
    if (!fault.empty() || depth == 0) return fault;
    return "it does not parse: it ends before its elements do";
}

}  // namespace host
