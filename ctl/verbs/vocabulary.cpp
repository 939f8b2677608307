#include "ctl/verbs/vocabulary.h"

#include <iterator>

#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/verb_table.h"

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

const Vocabulary& hostVocabulary() {
    static const Vocabulary vocabulary = [] {
        Vocabulary words{"Manages the monitoring agents of one host", kGlobalArguments, {}, {}};
        words.verbs.assign(std::begin(kVerbs), std::end(kVerbs));
        for (const VerbGroup& group : kVerbGroups)
            words.groups.push_back(&group);
        return words;
    }();
    return vocabulary;
}

}  // namespace ctl
