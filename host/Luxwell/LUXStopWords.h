// Words too common in a language to tell one page from another.
#pragma once

#include <string_view>

/// The stop words of a language by its tag ("en"), as they are written, separated by blanks; empty
/// for a language without a list. Articles, pronouns, prepositions, conjunctions, auxiliary verbs
/// and their like: nothing that a help page could be about. Thread-safety: immutable.
std::string_view LUXStopWordsForLanguage(std::string_view tag) noexcept;
