#include "ctl/verbs/verb_table.h"

#include "ctl/verbs/vocabulary.h"

namespace ctl {

const Verb* findVerb(std::string_view name) {
    return hostVocabulary().findVerb(name);
}

const VerbGroup* findVerbGroup(std::string_view name) {
    return hostVocabulary().findGroup(name);
}

}  // namespace ctl
