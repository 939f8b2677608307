// Writes the manual pages of zavctl: zavctl_manual TEMPLATES DIRECTORY DATE

#include <string>

#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/verb_table.h"
#include "tools/manual/mdoc.h"
#include "tools/manual/pages.h"
#include "tools/manual/verb_pages.h"

namespace manual {

void writePages(const std::string& templates, const std::string& directory,
                const std::string& date) {
    const auto& verbs = ctl::hostVocabulary().verbs;
    write(directory + "/zavctl.1",
          filled(templates + "/zavctl.1.in", {{"DATE", date},
                                              {"OPTIONS", listOf(ctl::kGlobalArguments, false)},
                                              {"VERBS", entriesOf(verbs)},
                                              {"EXIT_STATUSES", exitStatuses()}}));
    VerbPages{templates, directory, date, "zavctl", ctl::kGlobalArguments, verbs}.write();
}

}  // namespace manual
