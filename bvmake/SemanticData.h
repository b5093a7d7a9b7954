// The semantic half of an index: from pages to what language models are trained from.
#pragma once

#include <cstddef>
#include <memory>
#include <string_view>
#include <vector>

#include "bvmake/PreparedFile.h"
#include "host/Luxwell/LUXIndexWriter.h"

class HelpTokenizer;

namespace bvmake {

/// A page as the semantic data take it: under its path without the slash in front. It stands in
/// what is given.
LUXDocumentView semanticDocument(const PreparedPage& page);

/// Whether there is a language of this tag or name ("de", "German").
bool isLanguage(std::string_view language);

/// The tokenizer for the language of a book, as far as it is known without its pages: `language`, a
/// tag or a name, when it is not empty; else that of a folder name such as "de.lproj", where
/// `folder` is one or lies in one. Null when neither tells.
std::shared_ptr<const HelpTokenizer> tokenizerForBook(std::string_view folder,
                                                      std::string_view language);

/// So many pages are looked at to find out a language …
inline constexpr size_t languageSample = 64;
/// … or fewer, when their files have more bytes than this.
inline constexpr uint64_t languageSampleBytes = uint64_t{32} << 20;

/// The tokenizer for the language that most of the pages say that they are in; where none says
/// anything, for the one that they look like. Never null.
std::shared_ptr<const HelpTokenizer> tokenizerForPages(
    const std::vector<const PreparedPage*>& pages);

}  // namespace bvmake
