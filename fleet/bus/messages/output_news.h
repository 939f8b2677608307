/// What the pieces of an answer about a task's output hold, before they are sealed.
#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// Who wants more output asks again that often.
constexpr std::chrono::seconds kOutputAskedAgain{10};
/// Output that nobody has asked for so long ends; and who has heard nothing for so long, although
/// they asked, gives up.
constexpr std::chrono::seconds kOutputGoodFor{30};

/// Something that a command has written.
struct OutputText {
    bool isError = false;  ///< of its standard error
    std::string text;      ///< UTF-8
};

/// A text of a piece is no longer, so that a piece fits into a message however it is escaped.
constexpr std::size_t kMostOutputText = std::size_t{16} * 1024;

/// One piece. Those of a stream are counted from 0, whichever of its questions they answer; a piece
/// without any text says only that the host has heard a question.
struct OutputNews {
    std::string stream;  ///< the identifier of the question that has begun it
    std::string after;   ///< behind which position it has begun; "" at the first byte that is kept
    std::string at;      ///< the position behind its texts; "" if the host has told none
    std::vector<OutputText> texts;
    Number lost = 0;      ///< bytes that came too fast for the link, before these texts
    bool isOver = false;  ///< there is no more, and it has ended as it should
    std::string error;    ///< why there is no more otherwise; "" if that is not so
    Number status = 0;    ///< of zavctl, in which the error would end it on that host
};

std::string textOfNews(const OutputNews& news);
/// Throws MessageError for anything that is none.
OutputNews readNews(std::string_view text);

/// The text in parts of at most kMostOutputText bytes. No character is cut.
std::vector<std::string> outputParts(std::string_view text);

}  // namespace fleet
