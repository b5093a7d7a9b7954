// The semantic half of an index: from pages to the data that language models are trained from.
#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "bvmake/Page.h"
#include "host/Luxwell/LUXIndexWriter.h"
#include "platform/Data.h"

class HelpTokenizer;

namespace bvmake {

/// Collects the pages of one book, in whatever language it is in. Thread-safety: confined to one
/// thread.
class SemanticData {
 public:
  /// The language of a book is, of the first of these that is known:
  ///  - `language`, a tag or a name ("de", "German"), when it is not empty;
  ///  - that of a folder name such as "de.lproj", where `folder` is one or lies in one;
  ///  - the one that most of the first pages say that they are in;
  ///  - the one that the first pages look like.
  SemanticData(std::string_view folder, std::string_view language);
  ~SemanticData();
  SemanticData(const SemanticData&) = delete;
  SemanticData& operator=(const SemanticData&) = delete;

  /// So many pages are looked at to find out the language.
  static constexpr size_t languageSample = 64;

  /// Whether there is a language of this tag or name.
  static bool isLanguage(std::string_view language);

  /// Adds a page under its path within the folder, which begins with a slash. `title` and
  /// `abstract` (none when empty) are what is shown of it.
  void addPage(std::string_view path, const std::string& title, const std::string& abstract,
               const Page& page);

  /// The bytes for the help-index file. Afterwards this is not used any more, but for
  /// languageTag(). Throws platform::Exception for a book too large for the format.
  platform::Data finish();

  /// The tag of the language; empty before finish().
  const std::string& languageTag() const noexcept { return _languageTag; }

 private:
  struct Waiting {
    LUXDocument document;
    std::string language;
  };

  void _decideLanguage();
  std::shared_ptr<const HelpTokenizer> _languageOfPages() const;

  /// Null until the language is decided.
  std::shared_ptr<const HelpTokenizer> _tokenizer;
  std::unique_ptr<LUXIndexWriter> _writer;
  std::vector<Waiting> _waiting;
  std::string _languageTag;
};

}  // namespace bvmake
