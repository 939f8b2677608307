/// Property files: lines of KEY=value.
#pragma once

#include <memory>

#include "base/zavarryi.h"
#include "base/zavhmap.h"
#include "base/zavstr.h"

namespace ZAV {

/// A property file cannot be read.
class ResourceBundleException {
public:
    explicit ResourceBundleException(const String& message) : message_(message) {}
    ResourceBundleException(const ResourceBundleException& other) = default;
    virtual ~ResourceBundleException() {}

    String getErrorMessage() const { return message_; }

private:
    String message_;
};

/// Deletes the String at `p`; null is ignored. For maps whose values are Strings.
void freeValueFunc(void* p);

/// The values of one property file, read once.
///
/// A line is "KEY=value", white space around either not counting; every "=" after the first belongs
/// to the value. Lines end in a line feed, with or without a carriage return before it. A line
/// whose first byte is the comment character is left out, and so is one without "=". Of several
/// lines with one key the last counts. There are no escapes, quotes or continued lines.
///
/// Copies share the values, which go with the last of them. Bundles may be read by several threads.
class ResourceBundle {
public:
    /// Reads the file; throws ResourceBundleException when that fails.
    ResourceBundle(const String& path, char commentChar);
    ResourceBundle(const ResourceBundle& other);
    ResourceBundle& operator=(const ResourceBundle&) = delete;
    virtual ~ResourceBundle() {}

    /// The value, which stays the bundle's; null when the key is absent.
    String* getValue(const String& key) const;
    /// All keys, in no order to rely on.
    Array<String> getKeys() const { return values_->getKeys(); }

private:
    void parseBuffer(char* buffer);
    void parseKeyValue(char* line);

    std::shared_ptr<StrPtrMap> values_;  // owns its Strings
    char commentChar_ = '\0';
};

}  // namespace ZAV
