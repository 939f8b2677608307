/// Property files: lines of KEY=value.
#pragma once

#include <memory>

#include "base/zavarryi.h"
#include "base/zavhmap.h"
#include "base/zavstr.h"

namespace ZAV {

/// Thrown when a property file cannot be read.
class ResourceBundleException {
public:
    explicit ResourceBundleException(const String& message) : message_(message) {}
    ResourceBundleException(const ResourceBundleException& other) = default;
    virtual ~ResourceBundleException() {}

    String getErrorMessage() const { return message_; }

private:
    String message_;
};

/// Deletes the String at `p`; does nothing for null. For maps whose values are Strings.
void freeValueFunc(void* p);

/// The values of one property file, read once.
///
/// A line is "KEY=value". White space around key and value is ignored; each "=" after the first
/// belongs to the value. Lines end in a line feed, with or without a carriage return before it.
/// Lines that begin with the comment character and lines without "=" are skipped. When a key
/// appears twice, the last line wins. There are no escapes, quotes or continuation lines.
///
/// Copies share the values, which are deleted with the last copy. Several threads may read a
/// bundle.
class ResourceBundle {
public:
    /// Reads the file. Throws ResourceBundleException when that fails.
    ResourceBundle(const String& path, char commentChar);
    ResourceBundle(const ResourceBundle& other);
    ResourceBundle& operator=(const ResourceBundle&) = delete;
    virtual ~ResourceBundle() {}

    /// The value, which the bundle owns; null when the key is missing.
    String* getValue(const String& key) const;
    /// All keys, in no particular order.
    Array<String> getKeys() const { return values_->getKeys(); }

private:
    void parseBuffer(char* buffer);
    void parseKeyValue(char* line);

    std::shared_ptr<StrPtrMap> values_;  // owns its Strings
    char commentChar_ = '\0';
};

}  // namespace ZAV
