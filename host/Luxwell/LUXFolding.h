// What makes two spellings the same word, for search by meaning.
#pragma once

#include <string>
#include <string_view>

struct LUXLanguage;

namespace luxfolding {

/// The word without differences of case and compatibility, composed (NFKC_Casefold, then NFC).
/// Capital letters are those of the language: in Turkish the small letter of I is the dotless i.
/// Stemmers take this form. Ill-formed UTF-8 becomes U+FFFD. Thread-safety: any thread.
std::string caseFolded(std::string_view word, const LUXLanguage& language);

/// A case-folded word without its diacritics: the marks of Latin, Greek, Cyrillic, Hebrew, Arabic
/// and Syriac; letters whose stroke or ligature Unicode does not take apart become plain ones.
/// Marks that are vowels (Devanagari, Thai …) or voicing (kana) stay. Thread-safety: any thread.
std::string withoutDiacritics(std::string_view folded);

/// The text without differences of compatibility (NFKC): full-width Latin letters become plain
/// ones, half-width kana full. Thread-safety: any thread.
std::string compatibilityForm(std::string_view text);

}  // namespace luxfolding
