/// The host's stream of a task's output in the words of its pieces.
#pragma once

#include <deque>
#include <string>
#include <utility>

#include "ctl/client/http/event_parser.h"
#include "fleet/bus/messages/output_news.h"

namespace fleet {

/// Gathers what the host sends until it is passed on. One thread at a time.
class OutputBatch {
public:
    /// Of one piece, so that it fits into a message although each text brings some bytes with it.
    static constexpr std::size_t kMostTexts = 512;

    /// `position` is where the stream begins; "" if the host tells none.
    explicit OutputBatch(std::string position) : at_(std::move(position)) {}

    /// An event of the host, of which it may make several texts. Events that nobody knows are left
    /// out, so that a newer host is understood.
    void add(const ctl::ServerEvent& event);
    /// Whether there is as much as one piece takes, or the end.
    bool isFull() const {
        return isOver_ || bytes_ >= kMostOutputText || texts_.size() >= kMostTexts;
    }
    bool isEmpty() const { return texts_.empty() && lost_ == 0 && !isOver_; }
    /// The next piece, as much as fits. Its members for the stream are empty.
    OutputNews take();

private:
    struct Held {
        OutputText text;
        std::string at;  ///< the position behind it; "" inside of an event
    };

    std::deque<Held> texts_;
    std::size_t bytes_ = 0;  ///< of all texts
    std::string at_;         ///< behind what was taken
    Number lost_ = 0;
    bool isOver_ = false;
};

}  // namespace fleet
