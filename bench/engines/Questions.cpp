#include "bench/engines/Questions.h"

#include <algorithm>
#include <random>

#include "SearchKit/Tokenizer.h"

namespace engines {

namespace {

bool isPlain(const std::string& word) {
  return word.size() >= 3 && word.size() < 30 &&
         std::all_of(word.begin(), word.end(), [](char c) { return c >= 'a' && c <= 'z'; });
}

class Asker {
 public:
  Asker(const Books& books, uint32_t seed) : _random(seed) {
    for (const Book& book : books) {
      for (const searchkit::Document& page : book.pages) {
        _pages.push_back(&page);
      }
    }
  }

  size_t below(size_t limit) { return _random() % limit; }

  /// `count` different words of some page; none when the page drawn does not have them.
  std::vector<std::string> words(size_t count) {
    const searchkit::Document& page = *_pages[below(_pages.size())];
    std::vector<std::string> all;
    const bool isOfTitle = _turn++ % 2 == 0;
    if (isOfTitle) {
      _addWords(page.title.value_or(""), all);
      if (!page.headings.empty()) {
        _addWords(page.headings[below(page.headings.size())], all);
      }
    } else if (!page.body.empty()) {
      _addWords(page.body[below(page.body.size())], all);
    }
    if (all.size() < count) {
      return {};
    }
    std::shuffle(all.begin(), all.end(), _random);
    all.resize(count);
    return all;
  }

  /// A word in any script.
  std::string anyWord() {
    const searchkit::Document& page = *_pages[below(_pages.size())];
    std::vector<std::string> all;
    searchkit::Tokenizer().tokenize(page.title.value_or(""),
                                    [&](std::string_view term, bool) { all.emplace_back(term); });
    return all.empty() ? std::string() : all[below(all.size())];
  }

 private:
  static void _addWords(const std::string& text, std::vector<std::string>& words) {
    searchkit::Tokenizer().tokenize(text, [&](std::string_view term, bool) {
      std::string word(term);
      if (isPlain(word) && std::find(words.begin(), words.end(), word) == words.end()) {
        words.push_back(std::move(word));
      }
    });
  }

  std::vector<const searchkit::Document*> _pages;
  std::mt19937 _random;
  size_t _turn = 0;
};

// The first two to four letters of each word.
bool makePrefixes(Question& question, Asker& asker) {
  question.isPrefix = true;
  for (std::string& term : question.terms) {
    term.resize(std::min(term.size(), 2 + asker.below(3)));
  }
  std::sort(question.terms.begin(), question.terms.end());
  return std::adjacent_find(question.terms.begin(), question.terms.end()) == question.terms.end();
}

}  // namespace

std::vector<QuestionClass> questionClasses(const Books& books, size_t count, uint32_t seed) {
  static constexpr const char* names[] = {"one word", "two words", "three words"};
  static constexpr const char* prefixNames[] = {"one prefix", "two prefixes", "three prefixes"};
  std::vector<QuestionClass> classes;
  Asker asker(books, seed);
  for (const bool isPrefix : {false, true}) {
    for (size_t words = 1; words <= 3; ++words) {
      QuestionClass made;
      made.name = isPrefix ? prefixNames[words - 1] : names[words - 1];
      while (made.questions.size() < count) {
        Question question;
        question.terms = asker.words(words);
        if (!question.terms.empty() && (!isPrefix || makePrefixes(question, asker))) {
          made.questions.push_back(std::move(question));
        }
      }
      classes.push_back(std::move(made));
    }
  }
  return classes;
}

Question allLetters() {
  Question question;
  question.isPrefix = true;
  for (char letter = 'a'; letter <= 'z'; ++letter) {
    question.terms.emplace_back(1, letter);
  }
  return question;
}

std::vector<Question> questionsToCompare(const Books& books, size_t count, uint32_t seed) {
  std::vector<Question> questions;
  for (const QuestionClass& some : questionClasses(books, count, seed)) {
    for (Question question : some.questions) {
      questions.push_back(question);
      question.isAny = true;
      questions.push_back(std::move(question));
    }
  }
  Asker asker(books, seed + 1);
  for (size_t i = 0; i < count; ++i) {
    Question question;
    question.isPrefix = true;
    question.terms = {asker.anyWord()};
    // A query is split as pages are, and words of scripts without blanks may come apart again.
    size_t words = 0;
    searchkit::Tokenizer().tokenize(question.terms[0], [&](std::string_view, bool) { ++words; });
    if (words == 1) {
      questions.push_back(std::move(question));
    }
  }
  questions.push_back(allLetters());
  return questions;
}

}  // namespace engines
