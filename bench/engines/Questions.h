// What is asked of the engines.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "bench/engines/Corpus.h"
#include "bench/engines/Engine.h"

namespace engines {

struct QuestionClass {
  std::string name;
  std::vector<Question> questions;
};

/// Words that stand together in a title or heading, or near one another in a page's text, in turns:
/// what somebody might ask who wants that page. The same for the same books and seed.
/// One, two and three words, in full and as their first two to four letters.
std::vector<QuestionClass> questionClasses(const Books& books, size_t count, uint32_t seed);

/// The beginnings "a" to "z", all of them at once.
Question allLetters();

/// Every question that makes sense for comparing the engines: those above, with any of the words
/// as well, words of all scripts among them.
std::vector<Question> questionsToCompare(const Books& books, size_t count, uint32_t seed);

}  // namespace engines
