#include "host/home/run_as_list.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <memory>
#include <string_view>
#include <system_error>

#include "platform/xml1.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

constexpr int kPiece = 16 * 1024;
constexpr std::size_t kLargest = std::size_t{16} << 20;
/// A user's name that is longer is nobody's.
constexpr std::size_t kLongestName = 1'024;

std::string trimmedField(const std::string& text) {
    constexpr std::string_view kBlanks = " \t\r\n";
    const std::size_t begin = text.find_first_not_of(kBlanks);
    if (begin == std::string::npos) return "";
    return text.substr(begin, text.find_last_not_of(kBlanks) + 1 - begin);
}

/// Follows the elements of a list: a root with agents, an agent with its product code and its
/// instances, an instance with its name and its user.
class ListReader {
public:
    explicit ListReader(RunAsList& list) : list_(list) {}

    void open(std::string_view name) {
        ++depth_;
        if (depth_ == kAgentDepth) openAgent(name);
        if (depth_ == kInstanceDepth && isInAgent_) openPartOfAgent(name);
        if (depth_ == kUserDepth && isInInstance_) openPartOfInstance(name);
    }
    void add(std::string_view text) {
        if (isInUser_ && depth_ == kUserDepth && user_.size() <= kLongestName) user_ += text;
    }
    void close() {
        if (depth_ == kUserDepth) closePartOfInstance();
        if (depth_ == kInstanceDepth) closePartOfAgent();
        if (depth_ == kAgentDepth) closeAgent();
        --depth_;
    }
    bool isComplete() const { return depth_ == 0; }

private:
    static constexpr long kAgentDepth = 2;
    static constexpr long kInstanceDepth = 3;
    static constexpr long kUserDepth = 4;

    void openAgent(std::string_view name) {
        isInAgent_ = name == "agent";
        hasCode_ = false;
    }
    void openPartOfAgent(std::string_view name) {
        hasCode_ = hasCode_ || name == "productCode";
        isInInstance_ = name == "instance";
        hasName_ = false;
        hasUser_ = false;
    }
    void openPartOfInstance(std::string_view name) {
        hasName_ = hasName_ || name == "name";
        isInUser_ = name == "user" && !hasUser_;  // the first one counts
        hasUser_ = hasUser_ || isInUser_;
        user_.clear();
    }
    void closePartOfInstance() {
        const std::string user = isInUser_ ? trimmedField(user_) : "";
        if (!user.empty()) list_.users.insert(user);
        isInUser_ = false;
    }
    void closePartOfAgent() {
        if (isInInstance_ && !(hasName_ && hasUser_)) {
            complain("it has an instance without a name or a user");
        }
        isInInstance_ = false;
    }
    void closeAgent() {
        if (isInAgent_ && !hasCode_) complain("it has an agent without a productCode");
        isInAgent_ = false;
    }
    void complain(const char* what) {
        if (list_.fault.empty()) list_.fault = what;
    }

    RunAsList& list_;
    std::string user_;
    long depth_ = 0;
    bool isInAgent_ = false;
    bool hasCode_ = false;
    bool isInInstance_ = false;
    bool hasName_ = false;
    bool hasUser_ = false;
    bool isInUser_ = false;
};

void onStart(void* reader, const char* name, const char**) {
    static_cast<ListReader*>(reader)->open(name);
}

void onEnd(void* reader, const char*) {
    static_cast<ListReader*>(reader)->close();
}

void onText(void* reader, const char* text, int length) {
    static_cast<ListReader*>(reader)->add({text, static_cast<std::size_t>(length)});
}

using Parser = std::unique_ptr<XML1_PARSER, decltype(&XML1_ParserFree)>;

std::string unreadable(int error) {
    return "it cannot be read: " + std::generic_category().message(error);
}

std::string parseFault(XML1_PARSER* parser) {
    const char* const text = XML1_ErrorString(XML1_GetErrorCode(parser));
    return std::string("it does not parse: ") + (text == nullptr ? "unknown error" : text) +
           " in line " + std::to_string(XML1_GetCurrentLineNumber(parser));
}

/// Why the file is not XML; "" if it is.
std::string parse(const sys::FileDescriptor& file, XML1_PARSER* parser) {
    for (std::size_t total = 0; total <= kLargest;) {
        void* const piece = XML1_GetBuffer(parser, kPiece);
        if (piece == nullptr) return "it cannot be parsed for want of memory";
        const ssize_t length = ::read(file.get(), piece, kPiece);
        if (length < 0 && errno == EINTR) continue;
        if (length < 0) return unreadable(errno);
        if (XML1_ParseBuffer(parser, static_cast<int>(length), length == 0 ? 1 : 0) == 0) {
            return parseFault(parser);
        }
        if (length == 0) return "";
        total += static_cast<std::size_t>(length);
    }
    return "it is too large";
}

/// Fills in the users. Returns why the list as a whole is none; "" if it is one.
std::string read(RunAsList& list) {
    const sys::FileDescriptor file(::open(list.path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (!file) return unreadable(errno);
    struct stat found {};
    if (::fstat(file.get(), &found) != 0 || !S_ISREG(found.st_mode)) return "it is not a file";
    const Parser parser(XML1_ParserCreate(nullptr), &XML1_ParserFree);
    if (parser == nullptr) return "it cannot be parsed for want of memory";
    ListReader reader(list);
    XML1_SetUserData(parser.get(), &reader);
    XML1_SetElementHandler(parser.get(), onStart, onEnd);
    XML1_SetCharacterDataHandler(parser.get(), onText);
    const std::string fault = parse(file, parser.get());
    if (!fault.empty()) return fault;
    return reader.isComplete() ? "" : "it does not parse: it ends before its elements do";
}

std::string pathIn(const std::string& home) {
    struct utsname names {};
    if (::uname(&names) != 0) return "";
    const std::string node = names.nodename;
    return home + "/config/" + node.substr(0, node.find('.')) + "_zavrunas.cfg";
}

}  // namespace

RunAsList readRunAsList(const std::string& home) {
    RunAsList list;
    list.path = pathIn(home);
    struct stat found {};
    // Only what is certainly not there needs no reading.
    if (::lstat(list.path.c_str(), &found) != 0 && (errno == ENOENT || errno == ENOTDIR)) {
        return list;
    }
    list.isThere = true;
    const std::string fault = read(list);
    if (!fault.empty()) list.fault = fault;
    return list;
}

}  // namespace host
