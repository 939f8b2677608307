/// The run-as database: the user account under which each instance of an agent is started.
///
/// The file is XML, in the home's configuration directory:
///
///     <runas>
///         <agent>
///             <productCode>ux</productCode>
///             <instance>
///                 <name>main</name>
///                 <user>monitor</user>
///             </instance>
///         </agent>
///     </runas>
///
/// Use these objects on one thread at a time.
#pragma once

#include <memory>
#include <vector>

#include "base/zavdomp.h"
#include "base/zavstr.h"

namespace ZAV {

/// One instance of an agent and its user, which is empty when there is none.
class InstanceEntry {
public:
    InstanceEntry(const String& instanceName, const String& user)
        : instanceName_(instanceName), user_(user) {}
    virtual ~InstanceEntry() {}

    String getInstanceName() const { return instanceName_; }
    String getUser() const { return user_; }
    void setUser(const String& user) { user_ = user; }

private:
    friend InstanceEntry* buildInstanceEntry(const DOMElement* instanceElement);
    /// From the elements of its name and its user; null for an empty text.
    InstanceEntry(const DOMElement* nameElement, const DOMElement* userElement);

    String instanceName_;
    String user_;
};

/// One agent product. Owns its instances.
class AgentEntry {
public:
    explicit AgentEntry(const String& productCode) : productCode_(productCode) {}
    virtual ~AgentEntry() {}
    AgentEntry(const AgentEntry&) = delete;
    AgentEntry& operator=(const AgentEntry&) = delete;

    String getProductCode() const { return productCode_; }
    /// Appends an instance and takes ownership of it.
    void addInstance(InstanceEntry* instance);
    /// Deletes the instance at `index`, if there is one. Its slot remains and still counts;
    /// getInstance returns null for it.
    void removeInstance(unsigned index);
    /// The instance at `index`, owned by the agent; null when `index` is out of range.
    InstanceEntry* getInstance(unsigned index) const;
    /// The first instance with exactly this name, owned by the agent; null when there is none.
    InstanceEntry* getInstance(const String& instanceName) const;
    unsigned getNumInstances() const { return static_cast<unsigned>(instances_.size()); }

private:
    friend AgentEntry* buildAgentEntry(const DOMElement* agentElement);
    /// From the element of its product code.
    explicit AgentEntry(const DOMElement& productCodeElement);

    String productCode_;
    std::vector<std::unique_ptr<InstanceEntry>> instances_;
};

/// The database in one file, which the constructor reads. Owns its agents.
class StartupDB {
public:
    /// Reads the file at `path`. When the file cannot be read or parsed, traces that and leaves the
    /// database empty.
    explicit StartupDB(const String& path);
    virtual ~StartupDB() {}
    StartupDB(const StartupDB&) = delete;
    StartupDB& operator=(const StartupDB&) = delete;

    /// Reads the file and adds its agents to the existing ones.
    void initialize();
    /// Writes the file in the form shown above. Values are not escaped, so they must not contain
    /// markup. Returns 1, or 0 when the file cannot be opened for writing.
    int save();

    /// Appends an agent and takes ownership of it.
    void addAgent(AgentEntry* agent);
    /// Deletes the agent at `index`, if there is one. Those after it move up.
    void removeAgent(unsigned index);
    /// The agent at `index`, owned by the database; null when `index` is out of range.
    AgentEntry* getAgent(unsigned index) const;
    /// The first agent with exactly this product code, owned by the database; null when there is
    /// none.
    AgentEntry* getAgent(const String& productCode) const;
    unsigned getNumAgents() const { return static_cast<unsigned>(agents_.size()); }

    /// Adds the agents among the direct children of `root`, whatever its tag name.
    void buildModel(const DOMElement* root);

private:
    String path_;
    std::vector<std::unique_ptr<AgentEntry>> agents_;
};

/// The first direct child with this tag name; null when there is none or `parent` is null.
DOMElement* getChildElement(const DOMElement* parent, const char* name);

/// Creates an agent with its instances; the caller owns it. Returns null, with a trace line, when
/// the element has no product code.
AgentEntry* buildAgentEntry(const DOMElement* agentElement);

/// Creates an instance, which the caller owns. Without a name it gets no user either.
InstanceEntry* buildInstanceEntry(const DOMElement* instanceElement);

}  // namespace ZAV
