// From text to words, stems and word groups: the same way for books and for queries.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

struct LUXLanguage;

/// Divides text into words and says of each what searching by meaning needs to know.
///
/// Words are divided as Unicode's annex 29 has it, Chinese, Japanese, Thai, Lao, Khmer and Burmese
/// by the dictionaries of ICU; "file_name", "os.path" and "wi-fi" are divided further, at every
/// character that is neither letter nor digit, since a reader may know one part only. "3.14" and
/// "can't" stay whole; a possessive "'s" is dropped.
///
/// The form of a word is without the differences that a search overlooks: case, compatibility
/// forms, diacritics. The stem is what Snowball's algorithm for the language leaves of the word,
/// folded in the same way; in Korean it is what is left without particles and verb endings; in
/// other languages without an algorithm it is the form.
///
/// Thread-safety: immutable.
class HelpTokenizer {
 public:
  struct Word {
    /// Folded; never empty, at most maximumFormLength bytes, well-formed UTF-8.
    std::string form;
    /// Never empty.
    std::string stem;
    /// As written, without a possessive "'s"; for showing.
    std::string surface;
    /// Too common in the language to tell pages apart.
    bool isStopWord = false;
    /// Something other than blanks stands between the word before and this one: a comma, the end
    /// of a block. A single connecting character inside a name ("wi-fi", "os.path") does not count.
    bool breaksChain = false;
    /// With the last word of a name whose parts are joined by '.', '_' or ':' ("os.path"), the form
    /// of the whole name; else empty.
    std::string wholeForm;
  };

  /// Changes whenever the same text may give other words or stems than before; models made by
  /// another version are built anew. The version of ICU is part of it.
  static uint32_t version();

  static constexpr size_t maximumFormLength = 255;

  /// The folder name of the language of a tag ("en-GB", "pt_BR", "zh-Hant-TW"), whether or not a
  /// model for it was built; absent for what is no tag and for languages that are not supported.
  static std::optional<std::string> luxLocalizationForLanguage(std::string_view languageTag);

  /// All folder names that luxLocalizationForLanguage() may give, in order.
  static const std::vector<std::string>& supportedLocalizations();

  /// The tokenizer of a language, by folder name or tag; null for a language that is not supported.
  /// There is one for each language, which lives as long as the process.
  static std::shared_ptr<const HelpTokenizer> tokenizerForLanguage(std::string_view localization);

  /// The folder name, and the tag ("en"), of the tokenizer's language.
  std::string localization() const;
  std::string languageTag() const;

  /// The stems of the words that are no stop words, joined by one blank; the forms of all words
  /// where all are stop words. Two titles that differ only in what a search overlooks give the
  /// same.
  std::string tokenizedStringFromString(std::string_view text) const;

  /// How many parts the string has that are not empty: the words of a group that are joined by
  /// `usingSeparator`. Without a separator it is one part, or none when empty.
  static size_t countOfGramsInTokenString(std::string_view tokenString,
                                          std::string_view usingSeparator);

  /// Appends the words of `text`, in order; the first breaks the chain. Ill-formed UTF-8 separates
  /// words. Takes time linear in the length of the text.
  void wordsOfText(std::string_view text, std::vector<Word>& words) const;

  /// A word that is not folded yet.
  struct Segment {
    std::string_view surface;
    bool breaksChain = false;
    /// As Word::wholeForm, not folded.
    std::string_view whole;
  };

  /// Appends the words of `text` as they stand; wordsOfText() is this and wordOfSurface() for each.
  /// For whoever meets the same words again and again. The views are into `text` or, for text that
  /// has to be brought into another form first, into `buffer`; both must outlive them, and `buffer`
  /// is overwritten.
  void segmentsOfText(std::string_view text, std::vector<Segment>& segments,
                      std::string& buffer) const;

  /// Form and stem of one segment; absent for one that leaves nothing when it is folded. Says
  /// nothing of the chain and of whole names.
  std::optional<Word> wordOfSurface(std::string_view surface) const;

  /// The form alone; empty where wordOfSurface() gives nothing.
  std::string formOfSurface(std::string_view surface) const;

  /// Words as a person reads them: joined by one blank, but by none beside a word of a script that
  /// has no blanks between words.
  static void appendToDisplay(std::string& display, std::string_view surface);

 private:
  explicit HelpTokenizer(const LUXLanguage& language);

  std::string _folded(std::string_view surface) const;

  const LUXLanguage& _language;
  const bool _isKorean;
  std::unordered_set<std::string> _stopWords;
};
