#include "ctl/console/answer_room.h"

namespace console {

bool AnswerRoom::Share::grow(std::size_t bytes) {
    const std::size_t before = taken_->fetch_add(bytes);
    if (bytes > most_ || before > most_ - bytes) {
        *taken_ -= bytes;
        return false;
    }
    own_ += bytes;
    return true;
}

http::Reply noRoomForAnswer() {
    http::Reply reply =
        http::errorReply(503, "the console holds as many long answers as it may; ask again soon");
    reply.fields.emplace_back("Retry-After", "1");
    return reply;
}

}  // namespace console
