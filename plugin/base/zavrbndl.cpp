#include "base/zavrbndl.h"

#include <cstring>

#include "base/read_file.h"

namespace ZAV {
namespace {

String* trimmedCopy(const char* text) {
    auto copy = std::make_unique<String>(text);
    copy->trim();
    return copy.release();
}

/// The end of the line that starts at `line`: its line feed, the carriage return before that, or
/// the terminating 0.
char* endOfLine(char* line) {
    char* const feed = std::strchr(line, '\n');
    if (feed == nullptr) return line + std::strlen(line);
    return feed > line && feed[-1] == '\r' ? feed - 1 : feed;
}

}  // namespace

void freeValueFunc(void* p) {
    delete static_cast<String*>(p);
}

ResourceBundle::ResourceBundle(const String& path, char commentChar)
    : values_(std::make_shared<StrPtrMap>()), commentChar_(commentChar) {
    values_->setFreeValueFunc(reinterpret_cast<void*>(freeValueFunc));
    values_->setAutoDeleteValues(true);
    char* read = nullptr;
    const int rc = readFile(path.c_str(), &read);
    const MallocedText buffer(read);
    if (rc != 0) throw ResourceBundleException(String("Unable to read file: ") + path);
    if (buffer != nullptr) parseBuffer(buffer.get());
}

ResourceBundle::ResourceBundle(const ResourceBundle& other) : values_(other.values_) {}

String* ResourceBundle::getValue(const String& key) const {
    void* value = nullptr;
    return values_->get(key, &value) ? static_cast<String*>(value) : nullptr;
}

void ResourceBundle::parseBuffer(char* buffer) {
    char* line = buffer;
    for (;;) {
        char* const end = endOfLine(line);
        const char terminator = *end;
        *end = '\0';
        if (end != line || terminator == '\0') parseKeyValue(line);
        *end = terminator;
        if (terminator == '\0') return;
        line = end + (terminator == '\r' ? 2 : 1);
    }
}

void ResourceBundle::parseKeyValue(char* line) {
    if (*line == commentChar_) return;
    char* const equals = std::strchr(line, '=');
    if (equals == nullptr) return;
    *equals = '\0';
    String key(line);
    *equals = '=';
    key.trim();
    std::unique_ptr<String> value(trimmedCopy(equals + 1));
    values_->put(key, value.get());
    value.release();
}

}  // namespace ZAV
