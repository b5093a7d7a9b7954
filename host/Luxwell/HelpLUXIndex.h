// One book's semantic index data.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/LUXSectionedData.h"
#include "host/Luxwell/LUXTokenCounts.h"
#include "platform/Data.h"
#include "platform/Value.h"

// Keys of HelpLUXIndex::attributes().

/// Boolean: the book is to be left out of search by meaning.
inline constexpr const char* HelpLUXIndexAttributeIgnoreLUXKey =
    "HelpLUXIndexAttributeIgnoreLUXKey";
/// Number: the score from which a phrase of two words is offered as a suggestion.
inline constexpr const char* HelpLUXIndexAttributeBigramThresholdKey =
    "HelpLUXIndexAttributeBigramThresholdKey";
/// Number: the same for phrases of three words.
inline constexpr const char* HelpLUXIndexAttributeTrigramThresholdKey =
    "HelpLUXIndexAttributeTrigramThresholdKey";
/// String: tag of the language that the book is written in.
inline constexpr const char* HelpLUXIndexAttributeLanguageKey = "HelpLUXIndexAttributeLanguageKey";

/// Number: HelpTokenizer::version() of the tokenizer that made the tokens.
inline constexpr const char* HelpLUXIndexAttributeTokenizerVersionKey =
    "HelpLUXIndexAttributeTokenizerVersionKey";

// Keys of HelpLUXIndex::fileProperitesForKey().

/// String: the page's title, never empty.
inline constexpr const char* HelpDocPropertyTitle = "HelpDocPropertyTitle";
/// String: the page's description; not there when it has none.
inline constexpr const char* HelpDocPropertyDescription = "HelpDocPropertyDescription";
/// Boolean: the page is never to be found; not there when it may be.
inline constexpr const char* HelpDocPropertyExcludeFromSearch = "HelpDocPropertyExcludeFromSearch";

/// What a book's pages say, prepared for a language model: attributes of the whole, the keys and
/// properties of the pages (documents), and how often each token occurs in each.
/// docs/formats/lux-index.md has the bytes; sections not known here are carried along untouched.
///
/// The object is a view of the bytes that it was made from and keeps them alive. Opening looks at
/// the attributes only. A section is checked when it is first used; one that is damaged counts as
/// not there: without keys there are no documents, without token counts every page is empty, and
/// without places every token is LUXTokenCount::farDown.
/// Thread-safety: immutable; what is made at first use is internally synchronised.
class HelpLUXIndex {
 public:
  /// Sections: the attributes, a binary property list of one dictionary …
  static constexpr uint32_t attributesSectionType = 1;
  /// … the token counts of each document …
  static constexpr uint32_t countsSectionType = 2;
  /// … the documents' keys …
  static constexpr uint32_t keysSectionType = 3;
  /// … their properties …
  static constexpr uint32_t propertiesSectionType = 4;
  /// … the tokens …
  static constexpr uint32_t tokensSectionType = 5;
  /// … and where in each document its tokens begin.
  static constexpr uint32_t placesSectionType = 6;

  // Flags of a document's properties.
  static constexpr uint32_t excludedFlag = 1;
  static constexpr uint32_t hasDescriptionFlag = 2;

  /// Null when the bytes are not versioned index data of a version known here, or are damaged in
  /// the header, the table or the attributes.
  static std::shared_ptr<HelpLUXIndex> initWithVersionedData(const platform::Data& data);

  /// The bytes of an index that has attributes and nothing else. Throws platform::Exception
  /// "InvalidArgumentException" for a value that is no dictionary or that a property list cannot
  /// hold.
  static platform::Data versionedDataWithAttributes(const platform::Value& attributes);

  /// The index in the form that initWithVersionedData() takes, written afresh: equal content gives
  /// equal bytes, wherever the sections stood in the bytes that this object was made from.
  platform::Data versionedData() const;

  /// A dictionary, under the keys above; empty when the data has no attributes.
  const platform::Value& attributes() const noexcept { return _attributes; }

  /// The documents: their paths within the book, without a slash before them, in order of bytes.
  std::vector<std::string> documentKeys() const;
  /// The same.
  std::vector<std::string> keyEnumerator() const { return documentKeys(); }

  /// The tokens of a document; none for an unknown key. All counts that live at the same time share
  /// one table, which is made when there is none: whoever goes through the documents keeps the
  /// counts (or the table) of one while asking for the next.
  LUXTokenCounts tokenCountsForKey(std::string_view key) const;

  /// The properties of a document, a dictionary under the keys above; absent for an unknown key.
  platform::Value fileProperitesForKey(std::string_view key) const;

  ~HelpLUXIndex();

 private:
  struct Documents;
  struct Lazy;

  HelpLUXIndex(LUXSectionedData sections, platform::Value attributes);

  const Documents& _documents() const;
  std::shared_ptr<const LUXTokenTable> _table() const;

  const LUXSectionedData _sections;
  const platform::Value _attributes;
  const std::unique_ptr<Lazy> _lazy;
};
