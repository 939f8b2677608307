#include "ctl/verbs/vocabulary.h"

namespace ctl {

const Verb* Vocabulary::findVerb(std::string_view name) const {
    for (const Verb* const verb : verbs) {
        if (name == verb->name) return verb;
    }
    return nullptr;
}

const VerbGroup* Vocabulary::findGroup(std::string_view name) const {
    for (const VerbGroup* const group : groups) {
        if (name == group->name) return group;
    }
    return nullptr;
}

}  // namespace ctl
