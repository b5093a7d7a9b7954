// One book's semantic index data.
#pragma once

#include <memory>

#include "host/Luxwell/LUXSectionedData.h"
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

/// What a book's pages say, prepared for a language model: so far the attributes of the whole;
/// counts of tokens, document keys and document properties have sections of their own in the same
/// container (docs/formats/lux-index.md), which are carried along untouched.
///
/// The object is a view of the bytes that it was made from and keeps them alive.
/// Thread-safety: immutable.
class HelpLUXIndex {
 public:
  /// Section of the attributes: a binary property list of one dictionary.
  static constexpr uint32_t attributesSectionType = 1;

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

 private:
  HelpLUXIndex(LUXSectionedData sections, platform::Value attributes);

  const LUXSectionedData _sections;
  const platform::Value _attributes;
};
