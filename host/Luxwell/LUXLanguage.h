// The languages that books and queries may be in, and what is particular to each.
#pragma once

#include <span>
#include <string>
#include <string_view>

/// One supported language. Thread-safety: immutable; all that is handed out lives for ever.
struct LUXLanguage {
  enum class Apostrophe : unsigned char {
    /// Inside a word it belongs to the word ("can't", "o'clock").
    inside,
    /// It ends the word before it ("l'image", "dell'opera").
    divides,
    /// What follows it is an ending, left out ("Türkiye'nin").
    beginsEnding,
  };

  /// How folders of models are named: "English", "Brazilian Portuguese" is "Portuguese".
  const char* localization;
  /// The shortest tag of the language: "en".
  const char* tag;
  /// The name of the Snowball algorithm that finds stems; null where there is none.
  const char* stemmer = nullptr;
  Apostrophe apostrophe = Apostrophe::inside;

  /// All of them, in order of localization.
  static std::span<const LUXLanguage> all();

  /// The language of a folder name, whatever its case; null for any other text.
  static const LUXLanguage* withLocalization(std::string_view localization);

  /// The language of a tag: two or three letters, and whatever script, region, variants, character
  /// set or keywords follow after "-", "_", "." or "@", in any case ("en-GB", "pt_BR.UTF-8",
  /// "zh-Hant-TW", "deu"). A folder name is taken, too. Null for what is no tag, and for languages
  /// that are not supported.
  static const LUXLanguage* withTag(std::string_view languageTag);
};
