/// Answers one request from anywhere.
#pragma once

#include <functional>
#include <memory>
#include <utility>

#include "embedded/mutex.h"
#include "http/handler.h"

namespace http {

/// The way onto a server's I/O thread for those who may outlive the server.
class Mailbox {
public:
    /// Hands a function to the I/O thread; must return at once.
    using Post = std::function<void(std::function<void()> run)>;

    explicit Mailbox(Post post) : post_(std::move(post)) {}

    /// Runs `run` on the I/O thread soon, or never if the server has gone. Any thread.
    void post(std::function<void()> run) {
        const embedded::MutexLock lock(lock_);
        if (open_) post_(std::move(run));
    }
    /// The server goes: nothing is posted from now on.
    void close() {
        const embedded::MutexLock lock(lock_);
        open_ = false;
    }

private:
    const Post post_;
    embedded::Mutex lock_;
    bool open_ ZAV_GUARDED_BY(lock_) = true;
};

/// Where the answers to a client's requests arrive, on the I/O thread.
class AnswerTaker {
public:
    virtual ~AnswerTaker() = default;
    /// The answer to request number `exchange`; ignored if that one has been answered already.
    virtual void take(unsigned exchange, Answer answer) = 0;
};

/// Answers the request that it was made for. Any thread may call it, and copies of it, at any time:
/// the first answer counts, and one for a client or a server that has gone is dropped.
class Responder {
public:
    Responder(std::shared_ptr<Mailbox> mailbox, std::weak_ptr<AnswerTaker> taker, unsigned exchange)
        : mailbox_(std::move(mailbox)), taker_(std::move(taker)), exchange_(exchange) {}

    void operator()(Answer answer) const;

private:
    std::shared_ptr<Mailbox> mailbox_;
    std::weak_ptr<AnswerTaker> taker_;  // locked on the I/O thread only, where takers end
    unsigned exchange_;
};

}  // namespace http
