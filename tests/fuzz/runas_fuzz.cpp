// The run-as database: what is read from a file and written again reads the same.

#include <algorithm>
#include <vector>

#include "base/zavrunas.h"
#include "support/fuzz_support.h"

using fuzz::require;
using namespace ZAV;

namespace {

bool isTrimmed(const std::u16string& text) {
    return text.empty() ||
           (!String::isWhiteSpace(text.front()) && !String::isWhiteSpace(text.back()));
}

/// Values are written as they are: only these come back unchanged. Others than ASCII need more
/// bytes than their text has units and are cut.
bool survivesWriting(const std::u16string& text) {
    return std::all_of(text.begin(), text.end(), [](char16_t unit) {
        return unit < 0x7F && unit != '\r' && unit != '<' && unit != '>' && unit != '&';
    });
}

/// All texts of the database in order; `simple` tells whether all of them survive writing.
std::vector<std::u16string> textsOf(const StartupDB& database, bool& simple) {
    std::vector<std::u16string> texts;
    for (unsigned i = 0; i < database.getNumAgents(); ++i) {
        const AgentEntry* const agent = database.getAgent(i);
        texts.push_back(fuzz::unitsOf(agent->getProductCode()));
        require(database.getAgent(agent->getProductCode()) != nullptr, "agents are found");
        for (unsigned k = 0; k < agent->getNumInstances(); ++k) {
            const InstanceEntry* const instance = agent->getInstance(k);
            texts.push_back(fuzz::unitsOf(instance->getInstanceName()));
            texts.push_back(fuzz::unitsOf(instance->getUser()));
            require(agent->getInstance(instance->getInstanceName()) != nullptr,
                    "instances are found");
        }
        texts.emplace_back(1, u'\0');  // no value: where one agent ends
    }
    for (const std::u16string& text : texts)
        require(isTrimmed(text), "values are trimmed");
    simple = std::all_of(texts.begin(), texts.end(), survivesWriting);
    return texts;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const fuzz::MemoryFile file(fuzz::Input(data, size).rest());
    StartupDB database(file.path());
    bool simple = false;
    const std::vector<std::u16string> texts = textsOf(database, simple);
    require(database.save() == 1, "the database can be written");
    bool simpleAgain = false;
    const StartupDB again(file.path());
    const std::vector<std::u16string> textsAgain = textsOf(again, simpleAgain);
    if (simple) require(texts == textsAgain, "what was written reads the same");

    const unsigned agents = database.getNumAgents();
    database.initialize();
    require(!simple || database.getNumAgents() == 2 * agents, "reading again adds the agents");
    if (agents > 0) {
        database.removeAgent(0);
        require(!simple || database.getNumAgents() == 2 * agents - 1, "one agent is removed");
    }
    return 0;
}
