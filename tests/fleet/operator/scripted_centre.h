/// A centre over HTTPS whose every answer is written by the test.
#pragma once

#include <atomic>
#include <deque>
#include <map>
#include <mutex>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/fleet/https/tls_server.h"

namespace operator_test {

/// Answers what it is asked, one connection after the other.
class ScriptedCentre {
public:
    explicit ScriptedCentre(const fleet::ServerCertificate& certificate)
        : server_(certificate, [this](fleet_test::TlsServer& self) { serve(self); }) {}
    ~ScriptedCentre() {
        isStopping_ = true;
        server_.stop();
        server_.join();
    }

    std::string url() const { return server_.url(); }
    /// The next answer to a question such as "GET /v1/whoami"; the last one is given again and
    /// again. "ID" in a question stands for the roll-out that was made. `fields` are further header
    /// fields, each with its line end.
    void answer(const std::string& question, int status, const nlohmann::json& body,
                const std::string& fields = "") {
        const std::lock_guard lock(mutex_);
        answers_[question].push_back({status, body.dump(), fields});
    }
    /// The bodies that came with a question.
    std::vector<std::string> bodiesOf(const std::string& question) const {
        const std::lock_guard lock(mutex_);
        const auto found = bodies_.find(question);
        return found == bodies_.end() ? std::vector<std::string>() : found->second;
    }

private:
    struct Written {
        int status = 0;
        std::string body;
        std::string fields;
    };
    void serve(fleet_test::TlsServer& self) {
        while (!isStopping_) {
            fleet_test::TlsPeer peer = self.accept();
            for (std::string request = peer.request(); !request.empty(); request = peer.request()) {
                const Written answer = answerTo(request);
                peer.answer(answer.status, answer.body, answer.fields);
            }
        }
    }
    Written answerTo(const std::string& request) {
        const std::lock_guard lock(mutex_);
        std::string question = request.substr(0, request.find(" HTTP/1.1"));
        const std::string body = request.substr(request.find("\r\n\r\n") + 4);
        if (question == "POST /v1/rollouts") id_ = nlohmann::json::parse(body).value("id", "");
        if (const std::size_t at = id_.empty() ? std::string::npos : question.find(id_);
            at != std::string::npos) {
            question.replace(at, id_.size(), "ID");
        }
        bodies_[question].push_back(body);
        auto& answers = answers_[question];
        if (answers.empty()) return {404, R"({"error":"there is no such thing"})", ""};
        const Written next = answers.front();
        if (answers.size() > 1) answers.pop_front();
        return next;
    }

    mutable std::mutex mutex_;
    std::map<std::string, std::deque<Written>> answers_;
    std::map<std::string, std::vector<std::string>> bodies_;
    std::string id_;
    std::atomic<bool> isStopping_{false};
    fleet_test::TlsServer server_;
};

}  // namespace operator_test
