#include "http/responder.h"

namespace http {

void Responder::operator()(Answer answer) const {
    // A std::function holds only what can be copied.
    auto shared = std::make_shared<Answer>(std::move(answer));
    mailbox_->post([taker = taker_, exchange = exchange_, shared = std::move(shared)] {
        if (const auto alive = taker.lock()) alive->take(exchange, std::move(*shared));
    });
}

}  // namespace http
