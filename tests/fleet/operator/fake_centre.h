/// A centre whose every answer is written by the test.
#pragma once

#include <deque>
#include <map>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "ctl/client/failure.h"
#include "fleet/operator/centre/centre.h"

namespace operator_test {

class FakeCentre : public fleet::Centre {
public:
    using Answer = std::variant<nlohmann::json, ctl::Failure>;
    struct Asked {
        std::string what;  ///< such as "GET /v1/whoami"
        nlohmann::json body;
    };

    /// The next answer to that question. The last one is given again and again.
    void answer(const std::string& what, Answer answer) {
        answers_[what].push_back(std::move(answer));
    }
    const std::vector<Asked>& asked() const { return asked_; }
    std::vector<std::string> questions() const {
        std::vector<std::string> texts;
        for (const Asked& one : asked_)
            texts.push_back(one.what);
        return texts;
    }

    nlohmann::json get(const std::string& target) override {
        return reply({"GET " + target, nullptr});
    }
    nlohmann::json post(const std::string& target, const nlohmann::json& body) override {
        return reply({"POST " + target, body});
    }
    nlohmann::json postBytes(const std::string& target, std::string bytes) override {
        return reply({"POST " + target, bytes});
    }

private:
    nlohmann::json reply(Asked question) {
        asked_.push_back(std::move(question));
        const std::string& what = asked_.back().what;
        std::deque<Answer>& answers = answers_[what];
        if (answers.empty()) throw ctl::Failure(ctl::kWrongUsage, "there is no " + what);
        const Answer next = answers.front();
        if (answers.size() > 1) answers.pop_front();
        if (const auto* failure = std::get_if<ctl::Failure>(&next)) throw *failure;
        return std::get<nlohmann::json>(next);
    }

    std::map<std::string, std::deque<Answer>> answers_;
    std::vector<Asked> asked_;
};

}  // namespace operator_test
