/// One host's answer, piece by piece.
#pragma once

#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/messages/question.h"

namespace fleet {

class GatheredAnswer {
public:
    /// Of which question of which host; `signing` is the public key with which its link signs, and
    /// `key` opens the pieces. Borrows the key.
    GatheredAnswer(std::string host, std::string signing, std::string question, const KeyPair& key);

    const std::string& host() const { return host_; }
    /// Takes a message. What is not a piece of this answer, or was seen before, changes nothing.
    void take(std::string_view bytes);
    /// Whether all pieces are there.
    bool isWhole() const { return last_ && pieces_.size() == *last_ + 1; }
    /// Whether some have come, but not all up to the last one that is known.
    bool hasGap() const { return !isWhole() && !pieces_.empty(); }
    /// The answer's text; only if it is whole.
    std::string text() const;

private:
    const std::string host_;
    const std::string signing_;
    const std::string question_;
    const KeyPair& key_;
    std::map<Number, std::string> pieces_;
    std::optional<Number> last_;
};

}  // namespace fleet
