#include "host/home/run_as_list.h"

#include <fcntl.h>
#include <strings.h>
#include <sys/stat.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <memory>
#include <set>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "host/process/system/directory_stream.h"
#include "platform/xml1.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

constexpr int kPiece = 16 * 1024;
constexpr std::size_t kLargest = std::size_t{16} << 20;
/// No code, instance or user has a longer name.
constexpr std::size_t kLongestText = 1'024;
constexpr std::string_view kBlanks = " \t\r\n";

std::string trimmedField(const std::string& text) {
    const std::size_t begin = text.find_first_not_of(kBlanks);
    if (begin == std::string::npos) return "";
    return text.substr(begin, text.find_last_not_of(kBlanks) + 1 - begin);
}

enum class Element { Other, List, Agent, ProductCode, Instance, Name, User };

struct Place {
    Element parent;
    std::string_view name;
    Element element;
};

/// Where the plug-in looks for what. Its root may have any name.
constexpr std::array<Place, 5> kPlaces = {{
    {Element::List, "agent", Element::Agent},
    {Element::Agent, "productCode", Element::ProductCode},
    {Element::Agent, "instance", Element::Instance},
    {Element::Instance, "name", Element::Name},
    {Element::Instance, "user", Element::User},
}};

Element elementIn(Element parent, std::string_view name) {
    for (const Place& place : kPlaces) {
        if (place.parent == parent && place.name == name) return place.element;
    }
    return Element::Other;
}

bool hasText(Element element) {
    return element == Element::ProductCode || element == Element::Name || element == Element::User;
}

/// Whether there is no more in it than the list's own elements.
bool hasEntries(Element element) {
    return element == Element::List || element == Element::Agent || element == Element::Instance;
}

/// Whether the names differ in the case of their letters at most. Of `name`, what a namespace has
/// in front does not count.
bool isLike(std::string_view name, std::string_view known) {
    name.remove_prefix(name.rfind(':') + 1);
    return name.size() == known.size() &&
           ::strncasecmp(name.data(), known.data(), known.size()) == 0;
}

/// The entry that somebody may have meant by an element that the plug-in passes over; "" if none.
/// Other elements may hold names and users of their own.
std::string_view meantBy(std::string_view name, Element parent) {
    for (const Place& place : kPlaces) {
        if (hasText(place.element) && !hasEntries(parent)) continue;
        if (isLike(name, place.name)) return place.name;
    }
    return "";
}

/// Codes of products are compared letter by letter, and the products of a home are in lower case.
bool isProductCode(const std::string& text) {
    return !text.empty() &&
           text.find_first_not_of("abcdefghijklmnopqrstuvwxyz0123456789") == std::string::npos;
}

/// Follows the elements of a list: a root with agents, an agent with its product code and its
/// instances, an instance with its name and its user. The plug-in takes the first of two entries,
/// passes over what it does not look for, and puts the text in front of an element to that
/// element's own; each of them is a fault here.
class ListReader {
public:
    explicit ListReader(RunAsList& list) : list_(list) {}

    void open(std::string_view name) {
        const bool isRoot = open_.empty();
        const Element parent = isRoot ? Element::Other : open_.back();
        const Element element = isRoot ? Element::List : elementIn(parent, name);
        if (hasText(parent)) complain("it has elements in a productCode, a name or a user");
        if (isRoot || element == Element::Other) lookForStray(name, parent);
        if (element == Element::Agent) agent_ = {};
        if (element == Element::Instance) instance_ = {};
        open_.push_back(element);
        text_.clear();
    }
    void add(std::string_view text) {
        if (open_.empty()) return;
        if (hasText(open_.back())) {
            if (text_.size() <= kLongestText) text_ += text;
        } else if (hasEntries(open_.back()) && text.find_first_not_of(kBlanks) != text.npos) {
            complain("it has a text between its entries");
        }
    }
    void close() {
        if (open_.empty()) return;
        switch (open_.back()) {
            case Element::Agent:
                closeAgent();
                break;
            case Element::ProductCode:
                closeProductCode(trimmedField(text_));
                break;
            case Element::Instance:
                closeInstance();
                break;
            case Element::Name:
                closeName(trimmedField(text_));
                break;
            case Element::User:
                closeUser(trimmedField(text_));
                break;
            case Element::List:
            case Element::Other:
                break;
        }
        open_.pop_back();
    }
    bool isComplete() const { return open_.empty(); }

private:
    struct Agent {
        int productCodes = 0;
        std::set<std::string> instances;  ///< their names
    };
    struct Instance {
        int names = 0;
        int users = 0;
    };

    void lookForStray(std::string_view name, Element parent) {
        const std::string_view meant = meantBy(name, parent);
        if (meant.empty()) return;
        complain("it has something like <" + std::string(meant) + "> where none is looked for");
    }
    void closeProductCode(const std::string& code) {
        ++agent_.productCodes;
        if (agent_.productCodes > 1) {
            complain("it has an agent with more than one productCode");
        } else if (code.empty()) {
            complain("it has an empty productCode");
        } else if (!isProductCode(code)) {
            complain("it has a productCode that is not lower-case letters and digits");
        } else if (!productCodes_.insert(code).second) {
            complain("it has more than one agent with the productCode " + code);
        }
    }
    void closeAgent() {
        if (agent_.productCodes == 0) complain("it has an agent without a productCode");
    }
    void closeName(const std::string& name) {
        ++instance_.names;
        if (!agent_.instances.insert(name).second) {
            complain("it has an agent with more than one instance of the same name");
        }
    }
    void closeUser(const std::string& user) {
        ++instance_.users;
        if (!user.empty()) list_.users.insert(user);
    }
    void closeInstance() {
        if (instance_.names == 0 || instance_.users == 0) {
            complain("it has an instance without a name or a user");
        } else if (instance_.names > 1 || instance_.users > 1) {
            complain("it has an instance with more than one name or user");
        }
    }
    void complain(const std::string& what) {
        if (list_.fault.empty()) list_.fault = what;
    }

    RunAsList& list_;
    std::vector<Element> open_;
    std::string text_;  ///< of the innermost element
    std::set<std::string> productCodes_;
    Agent agent_;
    Instance instance_;
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

constexpr std::string_view kListEnding = "_zavrunas.cfg";

std::string listFolder(const std::string& home) {
    return home + "/config/";
}

std::string pathIn(const std::string& home) {
    struct utsname names {};
    if (::uname(&names) != 0) return "";
    const std::string node = names.nodename;
    return listFolder(home) + node.substr(0, node.find('.')) + std::string(kListEnding);
}

bool isListName(std::string_view name) {
    return name.size() > kListEnding.size() &&
           name.substr(name.size() - kListEnding.size()) == kListEnding;
}

RunAsList readList(std::string path) {
    RunAsList list;
    list.path = std::move(path);
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

}  // namespace

RunAsList readRunAsList(const std::string& home) {
    return readList(pathIn(home));
}

std::vector<std::string> foreignRunAsLists(const std::string& home) {
    const std::string folder = listFolder(home);
    const std::string own = pathIn(home);
    std::vector<std::string> found;
    const DirectoryStream directory(::opendir(folder.c_str()));
    while (const dirent* const entry = directory ? ::readdir(directory.get()) : nullptr) {
        const std::string path = folder + entry->d_name;
        if (!isListName(entry->d_name) || path == own) continue;
        const RunAsList list = readList(path);
        if (!list.fault.empty() || !list.users.empty()) found.push_back(path);
    }
    std::sort(found.begin(), found.end());
    return found;
}

}  // namespace host
