#include "ctl/completion/wanted.h"

#include <algorithm>
#include <cstddef>
#include <set>
#include <string_view>
#include <utility>

#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

bool startsWith(std::string_view text, std::string_view start) {
    return text.substr(0, start.size()) == start;
}

/// The first line of a declaration's help.
std::string shortHelp(const char* help) {
    const std::string text = help;
    return text.substr(0, text.find('\n'));
}

/// Reads the words from the left, as far as the declarations explain them.
class Reading {
public:
    Reading(const std::vector<std::string>& words, const Vocabulary& vocabulary)
        : vocabulary_(vocabulary) {
        const auto complete = words.size() - 1;
        for (std::size_t i = 0; i < complete; ++i)
            take(words[i]);
        finish(words.back());
    }

    Wanted wanted;

private:
    void take(const std::string& word) {
        if (pending_ != nullptr) {
            note(*std::exchange(pending_, nullptr), word);
        } else if (!optionsEnded_ && word == "--") {
            optionsEnded_ = true;
        } else if (!optionsEnded_ && startsWith(word, "-")) {
            takeOption(word);
        } else if (verb_ == nullptr) {
            name_ += (name_.empty() ? "" : " ") + word;
            verb_ = vocabulary_.findVerb(name_);
        } else if (const Verb* const longer = longerVerb(word)) {
            name_ = longer->name;
            verb_ = longer;
        } else {
            if (const Argument* const argument = nextPositional()) note(*argument, word);
            ++positionals_;
        }
    }
    /// Of a group whose name is a verb as well: the group's verb that the word completes.
    const Verb* longerVerb(const std::string& word) const {
        return positionals_ > 0 || optionsEnded_ ? nullptr
                                                 : vocabulary_.findVerb(name_ + " " + word);
    }
    void takeOption(const std::string& word) {
        const std::size_t equals = word.find('=');
        const Argument* const option = findOption(word.substr(0, equals));
        given_.insert(word.substr(0, equals));
        if (option == nullptr || option->kind == Argument::Kind::Flag) return;
        if (equals == std::string::npos) {
            pending_ = option;
        } else {
            note(*option, word.substr(equals + 1));
        }
    }
    /// A value that other values depend on.
    void note(const Argument& argument, const std::string& value) {
        const std::string_view name = argument.name;
        if (name == kSocket.name) wanted.host.socket = value;
        if (name == kHostUser.name) wanted.hostUser = value;
        const bool isProduct = argument.completion == Completion::Product ||
                               argument.completion == Completion::DepotProduct;
        if (isProduct) wanted.product = value;
        if (argument.completion == Completion::Verb) explained_ += value + " ";
    }

    void finish(const std::string& word) {
        wanted.typed = word;
        if (pending_ != nullptr) {
            wanted.source = pending_->completion;
        } else if (!optionsEnded_ && startsWith(word, "-")) {
            finishOption(word);
        } else if (verb_ == nullptr) {
            offerVerbs(name_.empty() ? "" : name_ + " ");
        } else {
            if (positionals_ == 0 && !optionsEnded_) offerVerbs(name_ + " ");
            if (const Argument* const argument = nextPositional()) {
                wanted.source = argument->completion;
                if (wanted.source == Completion::Verb) offerVerbs(explained_);
            }
        }
    }
    void finishOption(const std::string& word) {
        const std::size_t equals = word.find('=');
        if (equals == std::string::npos) return offerOptions();
        const Argument* const option = findOption(word.substr(0, equals));
        if (option == nullptr || option->kind == Argument::Kind::Flag) return;
        wanted.lead = word.substr(0, equals + 1);
        wanted.typed = word.substr(equals + 1);
        wanted.source = option->completion;
    }

    void offer(const std::string& word, const char* help) {
        if (startsWith(word, wanted.typed)) wanted.words.push_back({word, shortHelp(help)});
    }
    void offerOptions() {
        wanted.isOption = true;
        for (const ArgumentList& list : lists()) {
            for (const Argument& argument : list) {
                const bool isOption = argument.kind != Argument::Kind::Positional;
                if (isOption && !argument.isHidden && given_.count(argument.name) == 0) {
                    offer(argument.name, argument.help);
                }
            }
        }
        if (verb_ == nullptr) offer("--version", "Show the versions");
        offer("--help", "Explain how it is used");
    }
    /// The next words of the names that begin like this: "" or "config ".
    void offerVerbs(const std::string& begin) {
        if (begin.empty()) {
            wanted.isVerb = verb_ == nullptr;
            for (const VerbGroup* const group : vocabulary_.groups) {
                // What is a verb, too, is offered as that.
                if (vocabulary_.findVerb(group->name) == nullptr) offer(group->name, group->help);
            }
        }
        for (const Verb* const verb : vocabulary_.verbs) {
            const std::string name = verb->name;
            if (!startsWith(name, begin)) continue;
            const std::string rest = name.substr(begin.size());
            if (rest.find(' ') == std::string::npos) offer(rest, verb->help);
        }
    }

    std::vector<ArgumentList> lists() const {
        std::vector<ArgumentList> lists;
        if (verb_ != nullptr) lists.push_back(verb_->arguments);
        lists.push_back(vocabulary_.globals);
        return lists;
    }
    const Argument* findOption(const std::string& name) const {
        for (const ArgumentList& list : lists()) {
            for (const Argument& argument : list) {
                if (argument.kind != Argument::Kind::Positional && argument.name == name) {
                    return &argument;
                }
            }
        }
        return nullptr;
    }
    /// The one that comes next; the last takes as many words as there are if it takes several.
    const Argument* nextPositional() const {
        std::size_t place = 0;
        for (const Argument& argument : verb_->arguments) {
            if (argument.kind != Argument::Kind::Positional) continue;
            if (place == positionals_ || argument.type == Argument::Type::Texts) return &argument;
            ++place;
        }
        return nullptr;
    }

    const Vocabulary& vocabulary_;
    std::string name_;  ///< of the verb, as far as it stands there
    const Verb* verb_ = nullptr;
    const Argument* pending_ = nullptr;  ///< an option whose value comes next
    bool optionsEnded_ = false;
    std::size_t positionals_ = 0;
    std::set<std::string> given_;  ///< options
    std::string explained_;        ///< what the verb "help" is to explain, with a blank behind it
};

}  // namespace

Wanted wantedBy(const std::vector<std::string>& words, const Vocabulary& vocabulary) {
    if (words.empty()) return wantedBy({""}, vocabulary);
    return Reading(words, vocabulary).wanted;
}

}  // namespace ctl
