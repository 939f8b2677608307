#include "ctl/verbs/verb_table.h"

namespace ctl {

const Verb* findVerb(std::string_view name) {
    for (const Verb* const verb : kVerbs) {
        if (name == verb->name) return verb;
    }
    return nullptr;
}

const VerbGroup* findVerbGroup(std::string_view name) {
    for (const VerbGroup& group : kVerbGroups) {
        if (name == group.name) return &group;
    }
    return nullptr;
}

}  // namespace ctl
