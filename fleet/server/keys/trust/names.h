/// Names and labels that administrators give.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/messages/selector.h"

namespace fleet {

/// Throws KeysError unless it has 1 to 64 characters that may stand in a selector, and is no key.
void checkName(const std::string& name);

/// "k=v,k=v"; "" has none. Throws KeysError.
Labels labelsOf(const std::string& text);

/// "a,b"; "" has none. Throws KeysError unless each may stand in a certificate: a name in which *
/// stands for any characters.
std::vector<std::string> patternsOf(const std::string& text);

// As they are kept, in JSON.
std::string keptLabels(const Labels& labels);
Labels labelsKept(const std::string& text);
std::string keptTexts(const std::vector<std::string>& texts);
std::vector<std::string> textsKept(const std::string& text);

}  // namespace fleet
