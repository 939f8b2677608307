/// Output as events of a stream, in the form in which a host streams its own.
#pragma once

#include <optional>
#include <string>

#include "ctl/client/failure.h"
#include "fleet/bus/messages/output_news.h"

namespace fleet {

/// Gathers what belongs together until its position is known. Events are {"stream": "stdout",
/// "text": "..."} without a name, "overflow" with {"lost": BYTES}, and besides those of a host
/// "gap" for a part that was lost on its way and "break" with {"error": "..."}. One thread at a
/// time.
class OutputEvents {
public:
    void add(const OutputText& text);
    void addLost(Number bytes);
    void addGap();

    /// All that was added, as text of an event stream. Who has got it goes on behind `position`; ""
    /// leaves that as it was.
    std::string upTo(const std::string& position);

private:
    void write(const std::string& position);

    std::string text_;
    std::optional<OutputText> last_;  ///< it has the position, once that is known
};

/// There is no more output.
std::string outputEnd();
/// There may be more, which cannot be had now.
std::string outputBreak(const ctl::Failure& failure);

}  // namespace fleet
