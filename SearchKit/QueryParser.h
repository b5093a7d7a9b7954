// Reads what a user typed as a query. Every text is one.
//
// Words stand apart by blanks, and a blank means AND, or OR by the option.
//
//   word      the word itself                 "a phrase"  the words one after the other
//   word*     words that begin so             +required   must be there
//   *word*    words that have it inside       -excluded   must not (also !excluded)
//   w*d       words that begin and end so     a & b, a | b, ( )
//
// `&` binds tighter than `|`. A blank that means AND is as strong as `&`, one that means OR as weak
// as `|`. `+`, `-` and `!` stand before a word, a phrase or a parenthesis.
//
// How the unclear is read:
//  - A sign inside or after a word is part of the word's spelling: "wi-fi", "C++", "what?!". Words
//    that punctuation joins are a phrase: "wi-fi" finds "wi-fi" and "wi fi".
//  - Two hyphens before a word are no exclusion: "--help" is the word as it stands in a manual. Of
//    other signs in a row the last counts. A hyphen or plus with a blank after it is a dash or
//    stray and ignored; "! word" excludes as "!word" does.
//  - Operators without an operand are ignored, of several in a row the last counts, and so are
//    stars without a word and empty parentheses.
//  - A parenthesis never closed closes at the end; one never opened was opened at the start.
//  - A quotation mark never closed, and with a blank before it, closes at the end; any other is
//    ignored. Typographic quotation marks are quotation marks.
//  - `|` and an OR blank join what is looked for, not what is not: "a | -b" is "a" without "b", as
//    is "(-b) a". Where nothing is looked for, nothing is found: "-b" alone has no hits.
//  - `+` among words that OR blanks join makes its word required and the others add to the score.
//  - A word shorter than those that the index took in is ignored; so is such a prefix for choosing
//    documents, but not for their score, unless it ends the query: there it is a word half typed.
//  - In scripts without blanks between words a term is also looked for as typed, and may go on.
//
// Depth and number of terms are bounded: parentheses deeper than maximumQueryDepth are ignored, and
// so are terms after the first maximumQueryTerms and, of those that need a walk through the
// dictionary (stars but for one at the end, and any star in a phrase), after maximumQueryScans.
#pragma once

#include <cstddef>
#include <string_view>

#include "SearchKit/Query.h"

namespace searchkit {

inline constexpr size_t maximumQueryDepth = 64;
inline constexpr size_t maximumQueryTerms = 16384;
inline constexpr size_t maximumQueryScans = 64;

/// The terms are split and folded for an index with this minimum length. Takes time linear in the
/// length of the text. Thread-safety: may be called from any thread.
QueryNode parseQuery(std::string_view text, bool blankMeansOr, size_t minimumTermLength);

}  // namespace searchkit
