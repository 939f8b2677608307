/// The run-as database: for each agent product and instance the user under whose account it is
/// started.
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
/// Objects here belong to one thread at a time.
#pragma once

#include <memory>
#include <vector>

#include "base/zavdomp.h"
#include "base/zavstr.h"

namespace ZAV {

/// One instance of an agent and its user; no user is an empty text.
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

/// One agent product and its instances, which it owns.
class AgentEntry {
public:
    explicit AgentEntry(const String& productCode) : productCode_(productCode) {}
    virtual ~AgentEntry() {}
    AgentEntry(const AgentEntry&) = delete;
    AgentEntry& operator=(const AgentEntry&) = delete;

    String getProductCode() const { return productCode_; }
    /// Puts an instance at the end and takes it over.
    void addInstance(InstanceEntry* instance);
    /// Deletes the instance at `index`, if there is one. Its slot stays, empty: it counts, and
    /// getInstance gives null for it.
    void removeInstance(unsigned index);
    /// Null when `index` is out of range. The instance stays the agent's.
    InstanceEntry* getInstance(unsigned index) const;
    /// The first instance of exactly that name, or null. The instance stays the agent's.
    InstanceEntry* getInstance(const String& instanceName) const;
    unsigned getNumInstances() const { return static_cast<unsigned>(instances_.size()); }

private:
    friend AgentEntry* buildAgentEntry(const DOMElement* agentElement);
    /// From the element of its product code.
    explicit AgentEntry(const DOMElement& productCodeElement);

    String productCode_;
    std::vector<std::unique_ptr<InstanceEntry>> instances_;
};

/// The database of one file, read when it is constructed. Owns its agents.
class StartupDB {
public:
    /// Reads the file at `path`. A file that cannot be read or parsed is traced and leaves the
    /// database empty.
    explicit StartupDB(const String& path);
    virtual ~StartupDB() {}
    StartupDB(const StartupDB&) = delete;
    StartupDB& operator=(const StartupDB&) = delete;

    /// Reads the file and adds its agents to those there are.
    void initialize();
    /// Writes the file in the form above, values as they are: they must not contain markup. Returns
    /// 1, or 0 when the file could not be opened for writing.
    int save();

    /// Puts an agent at the end and takes it over.
    void addAgent(AgentEntry* agent);
    /// Deletes the agent at `index`, if there is one; those behind it move up.
    void removeAgent(unsigned index);
    /// Null when `index` is out of range. The agent stays the database's.
    AgentEntry* getAgent(unsigned index) const;
    /// The first agent of exactly that product code, or null. The agent stays the database's.
    AgentEntry* getAgent(const String& productCode) const;
    unsigned getNumAgents() const { return static_cast<unsigned>(agents_.size()); }

    /// Adds the agents among the direct children of `root`, whatever `root` is called.
    void buildModel(const DOMElement* root);

private:
    String path_;
    std::vector<std::unique_ptr<AgentEntry>> agents_;
};

/// The first direct child of that tag name; null when there is none or `parent` is null.
DOMElement* getChildElement(const DOMElement* parent, const char* name);

/// A new agent, which the caller owns, with its instances; null, and a trace line, when the element
/// has no product code.
AgentEntry* buildAgentEntry(const DOMElement* agentElement);

/// A new instance, which the caller owns. Without a name it has no user either.
InstanceEntry* buildInstanceEntry(const DOMElement* instanceElement);

}  // namespace ZAV
