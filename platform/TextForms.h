// Unicode's normal forms, and letters without their diacritics. What makes two spellings the same
// word is for those to say who compare words; this is what they say it with.
#pragma once

#include <string>
#include <string_view>

namespace platform {

/// UTF-8 as UTF-16; what is ill-formed becomes U+FFFD.
/// Thread-safety of all functions here: may be called from any thread.
std::u16string utf16FromUTF8(std::string_view text);
/// Well-formed UTF-16 as UTF-8.
std::string utf8FromUTF16(std::u16string_view text);

/// Unicode Standard Annex #15; the last is from section 3.13 of the Unicode Standard.
enum class NormalForm : unsigned char {
  /// NFC.
  composed,
  /// NFD.
  decomposed,
  /// NFKC.
  compatible,
  /// NFKC_Casefold: no differences of case and compatibility, no invisible characters.
  caseless,
};

/// Brings text into that form. It stays as it is where ICU lacks the form, which means that its
/// data are missing.
void normalize(NormalForm form, std::u16string& text);

/// Takes the diacritics out of decomposed, case-folded text: the marks that belong to no script of
/// their own and those of Latin, Greek, Cyrillic, Hebrew, Arabic and Syriac. Elsewhere (Indic
/// scripts, Thai, Khmer …) marks are vowels and stay, and so do the voicing marks of kana. Letters
/// whose stroke, dot or ligature Unicode does not decompose become the plain letters (o for ø, l
/// for ł, i for the dotless i, ae for æ …), and the Arabic elongation is dropped.
void dropDiacritics(std::u16string& text);

}  // namespace platform
