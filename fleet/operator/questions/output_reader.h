/// A stream of output from the pieces in which it comes.
#pragma once

#include <deque>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/output_news.h"

namespace fleet {

/// Believes only pieces that the host's link has signed and sealed for this reader, as answers to
/// questions that were asked lately. One thread at a time.
class OutputReader {
public:
    /// What a message has brought.
    struct Heard {
        OutputNews news;
        bool hasGap = false;  ///< pieces before it were lost
    };

    /// Of which host; `signing` is the public key with which its link signs. It goes on behind
    /// `position`; "" at the first byte that the host has kept. Without a key it makes one.
    OutputReader(std::string host, std::string signing, std::string position = {},
                 const std::optional<KeyPair>& key = {});

    /// For whom the host is to seal the pieces.
    const std::string& answerTo() const { return key_.publicKey(); }
    /// A question was asked: its answers count from now on, and those of the latest few before it.
    void asked(const std::string& question);

    /// What the message holds; nothing if it is no piece of this stream, or was seen before.
    std::optional<Heard> take(std::string_view bytes);

    /// What to name in the next question, so that the stream goes on: the identifier of the stream,
    /// and the position behind all that came. "" before anything came.
    const std::string& stream() const { return stream_; }
    const std::string& position() const { return position_; }

private:
    bool isAsked(const std::string& question) const;
    bool belongs(const OutputNews& news) const;

    const std::string host_;
    const std::string signing_;
    const KeyPair key_;
    std::deque<std::string> asked_;
    std::string stream_;
    std::string position_;
    Number next_ = 0;  ///< the place of the piece that comes next
};

}  // namespace fleet
