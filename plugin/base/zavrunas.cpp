#include "base/zavrunas.h"

#include <fcntl.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "base/file_descriptor.h"
#include "base/read_file.h"
#include "base/zavtrace.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavrunas"};

constexpr mode_t kFileMode = 0666;

String trimmedText(const DOMElement& element) {
    String text(element.getElementText());
    text.trim();
    return text;
}

/// Whether the element has this tag name, which is ASCII.
bool isNamed(const DOMElement& element, const char* tagName) {
    const unsigned short* name = element.getTagName();
    if (name == nullptr) return false;
    while (*name != 0 && *name == static_cast<unsigned char>(*tagName)) {
        ++name;
        ++tagName;
    }
    return *name == static_cast<unsigned char>(*tagName);
}

/// Calls `use` with each direct child that has this tag name, in order, until it returns false.
/// Unlike getElementsByTagName it leaves no list in the element.
template <typename Use>
void forEachChild(const DOMElement& parent, const char* tagName, Use use) {
    for (const DOMNode* node : parent.getChildren()->nodes()) {
        if (node->getNodeType() != DOMNode::ELEMENT_NODE) continue;
        const auto& element = static_cast<const DOMElement&>(*node);
        if (isNamed(element, tagName) && !use(element)) return;
    }
}

/// The first direct child with this tag name, or null.
const DOMElement* firstChild(const DOMElement* parent, const char* tagName) {
    const DOMElement* found = nullptr;
    if (parent != nullptr) {
        forEachChild(*parent, tagName, [&found](const DOMElement& element) {
            found = &element;
            return false;
        });
    }
    return found;
}

/// Adds one line of the file: `indent` tabs, and a value between its tags.
void addLeaf(std::string& text, std::size_t indent, const char* tag, const String& value) {
    const CharStar narrow = value.c_str();
    text.append(indent, '\t').append("<").append(tag).append(">");
    text.append(static_cast<const char*>(narrow));
    text.append("</").append(tag).append(">\n");
}

void addInstanceLines(std::string& text, const InstanceEntry& instance) {
    text += "\t\t<instance>\n";
    addLeaf(text, 3, "name", instance.getInstanceName());
    addLeaf(text, 3, "user", instance.getUser());
    text += "\t\t</instance>\n";
}

void addAgentLines(std::string& text, const AgentEntry& agent) {
    text += "\t<agent>\n";
    addLeaf(text, 2, "productCode", agent.getProductCode());
    for (unsigned i = 0; i < agent.getNumInstances(); ++i) {
        const InstanceEntry* const instance = agent.getInstance(i);
        if (instance != nullptr) addInstanceLines(text, *instance);
    }
    text += "\t</agent>\n";
}

}  // namespace

InstanceEntry::InstanceEntry(const DOMElement* nameElement, const DOMElement* userElement)
    : instanceName_(nameElement != nullptr ? trimmedText(*nameElement) : String()),
      user_(userElement != nullptr ? trimmedText(*userElement) : String()) {}

AgentEntry::AgentEntry(const DOMElement& productCodeElement)
    : productCode_(trimmedText(productCodeElement)) {}

void AgentEntry::addInstance(InstanceEntry* instance) {
    instances_.push_back(std::unique_ptr<InstanceEntry>(instance));
}

void AgentEntry::removeInstance(unsigned index) {
    if (index < instances_.size()) instances_[index].reset();
}

InstanceEntry* AgentEntry::getInstance(unsigned index) const {
    return index < instances_.size() ? instances_[index].get() : nullptr;
}

InstanceEntry* AgentEntry::getInstance(const String& instanceName) const {
    for (const auto& instance : instances_) {
        if (instance != nullptr && instance->getInstanceName() == instanceName) {
            return instance.get();
        }
    }
    return nullptr;
}

StartupDB::StartupDB(const String& path) : path_(path) {
    initialize();
}

void StartupDB::initialize() {
    Trace trace(traceUnit);
    trace().detail("Parsing file: %s", path_);
    char* read = nullptr;
    const int rc = readFile(path_.c_str(), &read);
    MallocedText text(read);
    if (text == nullptr) {
        trace().error("Error reading file (defaults will be used): %s. Error: %s", path_,
                      std::strerror(rc));
        return;
    }
    DOMParser parser(text.get());
    text.reset();
    if (parser.parse() == 0) {
        trace().error("Error parsing xml defaults will be used: %s", parser.getErrorMessage());
        return;
    }
    buildModel(parser.getDocument());
}

int StartupDB::save() {
    Trace trace(traceUnit);
    const FileDescriptor file = openFile(path_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, kFileMode);
    if (!file.isOpen()) {
        // The format ends in a lone percent sign, so the reason is not printed.
        trace().error("Error opening file, %s, in write mode: %", path_, std::strerror(errno));
        return trace.exit(0);
    }
    std::string text = "<runas>\n";
    for (const auto& agent : agents_) {
        if (agent != nullptr) addAgentLines(text, *agent);
    }
    text += "</runas>\n";
    writeAll(file.get(), text.data(), text.size());
    return trace.exit(1);
}

void StartupDB::addAgent(AgentEntry* agent) {
    agents_.push_back(std::unique_ptr<AgentEntry>(agent));
}

void StartupDB::removeAgent(unsigned index) {
    if (index < agents_.size()) {
        agents_.erase(agents_.begin() + static_cast<std::ptrdiff_t>(index));
    }
}

AgentEntry* StartupDB::getAgent(unsigned index) const {
    return index < agents_.size() ? agents_[index].get() : nullptr;
}

AgentEntry* StartupDB::getAgent(const String& productCode) const {
    for (const auto& agent : agents_) {
        if (agent != nullptr && agent->getProductCode() == productCode) return agent.get();
    }
    return nullptr;
}

void StartupDB::buildModel(const DOMElement* root) {
    Trace trace(traceUnit);
    if (root == nullptr) return;
    forEachChild(*root, "agent", [this](const DOMElement& element) {
        std::unique_ptr<AgentEntry> agent(buildAgentEntry(&element));
        if (agent != nullptr) agents_.push_back(std::move(agent));
        return true;
    });
}

DOMElement* getChildElement(const DOMElement* parent, const char* name) {
    Trace trace(traceUnit);
    if (parent == nullptr) return nullptr;
    const DOMNodeList* const found = parent->getElementsByTagName(name);
    return found != nullptr ? static_cast<DOMElement*>(found->item(0)) : nullptr;
}

AgentEntry* buildAgentEntry(const DOMElement* agentElement) {
    Trace trace(traceUnit);
    const DOMElement* const productCode = firstChild(agentElement, "productCode");
    if (productCode == nullptr) {
        trace().error("Agent element missing <productCode> element");
        return nullptr;
    }
    std::unique_ptr<AgentEntry> agent(new AgentEntry(*productCode));
    forEachChild(*agentElement, "instance", [&agent](const DOMElement& element) {
        agent->addInstance(buildInstanceEntry(&element));
        return true;
    });
    return agent.release();
}

InstanceEntry* buildInstanceEntry(const DOMElement* instanceElement) {
    Trace trace(traceUnit);
    const DOMElement* const nameElement = firstChild(instanceElement, "name");
    const DOMElement* const userElement = firstChild(instanceElement, "user");
    return new InstanceEntry(nameElement, nameElement != nullptr ? userElement : nullptr);
}

}  // namespace ZAV
