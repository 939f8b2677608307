#include "host/checks/check_list.h"

#include <algorithm>
#include <exception>
#include <utility>

namespace host {

/// The checks. Each is defined in a file of its subject in this folder and has a row below.
CheckFunction checkHome, checkAgentScript, checkInventory, checkTranslator, checkUninstaller,
    checkConsole, checkShell, checkOwners, checkDepot, checkTemporary, checkState, checkFilesystem,
    checkSpace, checkSockets, checkRunAs, checkLeftovers, checkTimeout, checkLocale, checkJava,
    checkClock, checkDescriptors, checkProcesses, checkPlugin;

const std::vector<Check>& checks() {
    static const std::vector<Check> rows = {
        {"home", checkHome},
        {"agent-script", checkAgentScript},
        {"inventory", checkInventory},
        {"translator", checkTranslator},
        {"uninstaller", checkUninstaller},
        {"console", checkConsole},
        {"shell", checkShell},
        {"owners", checkOwners},
        {"depot", checkDepot},
        {"tmp", checkTemporary},
        {"state", checkState},
        {"filesystem", checkFilesystem},
        {"space", checkSpace},
        {"sockets", checkSockets},
        {"run-as", checkRunAs},
        {"leftovers", checkLeftovers},
        {"time-out", checkTimeout},
        {"locale", checkLocale},
        {"java", checkJava},
        {"clock", checkClock},
        {"descriptors", checkDescriptors},
        {"processes", checkProcesses},
        {"plug-in", checkPlugin},
    };
    return rows;
}

std::vector<CheckResult> runChecks(CheckSubject& subject) {
    std::vector<CheckResult> results;
    for (const Check& check : checks()) {
        CheckResult result{check.name, {}};
        try {
            result.finding = check.look(subject);
        } catch (const std::exception& error) {
            result.finding = {Verdict::Warning,
                              std::string("the check itself failed: ") + error.what(), ""};
        }
        results.push_back(std::move(result));
    }
    return results;
}

bool hasError(const std::vector<CheckResult>& results) {
    return std::any_of(results.begin(), results.end(), [](const CheckResult& result) {
        return result.finding.verdict == Verdict::Error;
    });
}

std::string wordsOf(const Finding& finding) {
    return finding.remedy.empty() ? finding.text : finding.text + "; " + finding.remedy;
}

std::string lineOf(const CheckResult& result) {
    constexpr std::size_t kVerdictWidth = 9;  // of the longest verdict and two blanks
    constexpr std::size_t kNameWidth = 14;
    std::string line = nameOf(result.finding.verdict);
    line.resize(std::max(line.size() + 1, kVerdictWidth), ' ');
    std::string name = result.check;
    name.resize(std::max(name.size() + 1, kNameWidth), ' ');
    return line + name + wordsOf(result.finding) + "\n";
}

const char* nameOf(Verdict verdict) {
    switch (verdict) {
        case Verdict::Ok:
            return "ok";
        case Verdict::Warning:
            return "warning";
        case Verdict::Error:
            break;
    }
    return "error";
}

std::string CheckSubject::variable(const char* name) const {
    const char* const value = environment_(name);
    return value == nullptr ? "" : value;
}

const Inventory& CheckSubject::inventory() {
    if (!inventory_) inventory_ = readInventory(options.home);
    return *inventory_;
}

}  // namespace host
