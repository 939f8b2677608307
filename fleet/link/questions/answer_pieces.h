/// Answers as they are published.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/link/questions/question_judge.h"

namespace fleet {

/// An answer is no longer; a longer one is replaced by what says so.
constexpr std::size_t kMostAnswerBytes = std::size_t{1024} * 1024;

/// The signed messages of an answer, which is a JSON text: cut into pieces, each sealed for the
/// question's key.
std::vector<std::string> answerPieces(const std::string& host, const AskedQuestion& question,
                                      const std::string& answer, const KeyPair& signing);

}  // namespace fleet
