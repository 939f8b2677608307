// The guard of conditions that act differently from how they read. The plug-in takes the value of a
// condition whatever its operator is, and of a column that is given twice the last one. Conditions
// on columns that only an answer has do not change what is done, but hide the row that answers.

#include <algorithm>
#include <set>

#include "host/guard/guard.h"
#include "host/guard/refusal.h"
#include "host/guard/wording.h"
#include "host/tables/plugin_facts.h"

namespace host {

void checkConditions(CommandRequest& request, Machine& machine);

namespace {

[[noreturn]] void refuse(const std::string& reason, const std::string& hint) {
    throw Refusal("conditions", reason, hint, Refusal::Kind::Malformed);
}

void checkColumn(const oxa::Predicate& condition) {
    if (std::find(plugin::kResultColumns.begin(), plugin::kResultColumns.end(), condition.column) ==
        plugin::kResultColumns.end()) {
        return;
    }
    refuse(condition.column +
               " is a column of the answer; a request that names it is carried out "
               "whatever the answer is",
           "leave it out, and look at the row that answers");
}

void checkOriginNode(const oxa::Predicate& condition, const CodePage& codePage) {
    const std::string here = oxa::originNode();
    if (condition.column != plugin::kOriginNodeColumn || condition.value == here) return;
    refuse("this is the node " + codePage.toUtf8(here) + ", not " +
               quoted(condition.value, codePage) +
               "; the request would be carried out all the same",
           "leave ORIGINNODE out, or send the request to the other node");
}

}  // namespace

void checkConditions(CommandRequest& request, Machine& machine) {
    std::set<std::string> seen;
    for (const oxa::Predicate& condition : request.conditions()) {
        checkColumn(condition);
        if (condition.op != OPER_EQ) {
            refuse("a request gives values; " + condition.column +
                       " has an operator other than \"=\", which would be taken for \"=\"",
                   "give every column with \"=\"");
        }
        if (!seen.insert(condition.column).second) {
            refuse("the column " + condition.column + " is given twice",
                   "send one request for each value");
        }
        checkOriginNode(condition, machine.site().codePage);
    }
}

}  // namespace host
