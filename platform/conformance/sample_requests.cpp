#include "conformance/sample_requests.h"

namespace conformance {

std::vector<std::string> namesOf(const Rows& rows) {
    std::vector<std::string> names;
    for (const std::string& row : rows) {
        requireEqual(row.size(), sizeof(SampleRow), "the size of a row");
        const std::string name = row.substr(0, sizeof SampleRow::name);
        names.push_back(name.substr(0, name.find_last_not_of(' ') + 1));
    }
    return names;
}

LiveRequest::LiveRequest(Bench& bench, const Conditions& where) {
    requireEqual(manager.RegisterWithManager(), int{OXA_OK}, "the result of the registration");
    subscription_ =
        bench.driver().subscribe("SAMPLE", where, [this](const Rows& rows) { return take(rows); });
    require(subscription_ != nullptr, "there is no subscription");
}

LiveRequest::~LiveRequest() {
    end();
}

SampleRequest& LiveRequest::object() {
    manager.lock();
    rtoxa* const live = RtoxaListIter(&manager).Next();
    manager.unlock();
    require(live != nullptr, "a subscription's object is not live");
    return *static_cast<SampleRequest*>(live);
}

std::vector<std::string> LiveRequest::names() const {
    const std::lock_guard<std::mutex> guard(lock_);
    return names_;
}

int LiveRequest::calls() const {
    const std::lock_guard<std::mutex> guard(lock_);
    return calls_;
}

int LiveRequest::take(const Rows& rows) {
    const std::lock_guard<std::mutex> guard(lock_);
    ++calls_;
    for (std::string& name : namesOf(rows))
        names_.push_back(std::move(name));
    return answer;
}

}  // namespace conformance
