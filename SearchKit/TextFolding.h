// What makes two spellings the same word, and which characters words are made of.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace searchkit {

/// Appends to `folded` the text without the differences that a search overlooks:
///  - compatibility forms, case and invisible characters are folded (NFKC_Casefold), but a
///    zero-width space, which separates words, becomes a blank;
///  - marks are dropped where they are diacritics: the marks that belong to no script of their own
///    and those of Latin, Greek, Cyrillic, Hebrew, Arabic and Syriac. Elsewhere (Indic scripts,
///    Thai, Khmer …) marks are vowels and stay, and so do the voicing marks of kana;
///  - letters whose stroke, dot or ligature Unicode does not decompose become the plain letters
///    (o for ø, l for ł, i for the dotless i, ae for æ …), and the Arabic elongation is dropped.
/// The result is composed (NFC), and folding it again changes nothing. Ill-formed UTF-8 becomes
/// U+FFFD, which is in no word. Thread-safety: may be called from any thread.
void foldText(std::string_view text, std::u16string& folded);

/// What a character of folded text is to words.
enum class CharacterClass : unsigned char {
  /// Ends a word: blanks, punctuation, symbols, controls.
  separator,
  /// A letter or digit of a script that has blanks between words.
  letter,
  /// A letter of a script in which only a dictionary tells words apart: Chinese, Japanese, Korean,
  /// Thai, Lao, Khmer, Burmese.
  unspacedLetter,
  /// Belongs to the letter before it, and separates where there is none.
  mark,
};
CharacterClass characterClass(char32_t character) noexcept;

/// A longest stretch of folded text whose characters are all of words, and all of one kind.
struct Run {
  size_t begin = 0;
  size_t end = 0;
  /// It is of unspaced letters.
  bool unspaced = false;
};

/// Appends the runs of folded text, in order.
void findRuns(std::u16string_view folded, std::vector<Run>& runs);

/// The dictionaries work on whole runs in memory of several times their length, and text without
/// any punctuation may be one run of megabytes: longer runs are cut after so many characters.
inline constexpr size_t longestDictionaryPiece = 4096;

/// Appends the ends of the words of a run of unspaced letters, as ICU's dictionaries see them; the
/// last is the length of the run. Thread-safety: may be called from any thread.
void findWordEnds(std::u16string_view run, std::vector<size_t>& ends);

/// The version of the ICU that folds and splits here.
struct TextLibraryVersion {
  unsigned short major = 0;
  unsigned short minor = 0;
};
TextLibraryVersion textLibraryVersion() noexcept;

}  // namespace searchkit
