#include "ctl/verbs/verb_table.h"

#include <iterator>

#include "ctl/verbs/arguments/global_arguments.h"

namespace ctl {

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

const Verb* findVerb(std::string_view name) {
    return hostVocabulary().findVerb(name);
}

const VerbGroup* findVerbGroup(std::string_view name) {
    return hostVocabulary().findGroup(name);
}

}  // namespace ctl
