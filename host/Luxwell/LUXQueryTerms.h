// What a query says, taken apart as the pages of a model were.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/HelpTokenizer.h"

/// Asked every now and then by whatever takes long; true means: give up. Empty means: never.
using LUXIsCancelled = std::function<bool()>;

/// Whether a short text is written in the language of keyword searches: with words that must or
/// must not occur ("-word", "!word", "+word"), alternatives ("|" between blanks), unfinished words
/// ("wor*") or phrases in double quotation marks. Such a text says exactly what is to be found, and
/// is no question. "&" between blanks is no sign of it: people write it for "and". Texts of more
/// than eight words are questions whatever is in them.
bool LUXQueryHasOperators(std::string_view text);

/// The terms of a text, each once with the number of times that it occurs; stems and forms in order
/// of their first occurrence. It depends on the language alone, not on a model. Thread-safety:
/// immutable.
struct LUXQueryTerms {
  struct Term {
    std::string token;
    uint32_t count = 1;
  };

  /// Two stems by their places in `stems`.
  struct Pair {
    uint32_t first = 0;
    uint32_t second = 0;
    uint32_t count = 1;
  };

  /// Stems of the words that are no stop words; of all words where there are only stop words.
  std::vector<Term> stems;
  /// Pairs of stems that follow one another with nothing between them, as pages have them.
  std::vector<Pair> bigrams;
  /// Folded forms of the words that `stems` comes from, and of names that are made of several.
  std::vector<Term> forms;
  /// There are words, and all of them are stop words: no model counts their stems, only their
  /// forms.
  bool onlyStopWords = false;

  /// Form and stem of the last word while it may still be typed, that is when nothing follows its
  /// last character and it is no stop word; both empty else.
  std::string unfinishedForm;
  std::string unfinishedStem;

  /// The text as HelpTokenizer::tokenizedStringFromString() has it; empty as well for a text that
  /// is longer than titles are.
  std::string normalizedTitle;

  /// The forms of all words, stop words too, put together as they are shown: what the text and the
  /// phrases that begin with it have in common. Ends in a blank when the last word is finished.
  /// With each place at which a word begins. Empty, too, for a text that is longer than titles are.
  std::string foldedText;
  std::vector<size_t> wordStarts;

  /// The folded text with its word starts alone, and nothing of the rest: all that completing
  /// needs, which has to keep up with the keys.
  static LUXQueryTerms foldedTextOf(const HelpTokenizer& tokenizer, std::string_view text);

  /// Takes a text apart. When cancelled, what there is so far.
  static LUXQueryTerms termsOfText(const HelpTokenizer& tokenizer, std::string_view text,
                                   const LUXIsCancelled& isCancelled);
};
