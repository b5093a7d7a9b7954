// The container of semantic data, of a book or of a model: a checked header, a table, and sections.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/Data.h"

/// One section: a stretch of bytes whose meaning its type tells. Thread-safety: immutable.
struct LUXSection {
  uint32_t type = 0;
  /// CRC-32 as the table has it. Reading the container does not look at the bytes of sections, so
  /// whoever uses a section asks checksumMatches() first.
  uint32_t checksum = 0;
  platform::Data bytes;

  /// A section with the checksum of its bytes.
  static LUXSection sectionWithBytes(uint32_t type, platform::Data bytes);

  /// Whether the bytes are those that were written. Linear in their number.
  bool checksumMatches() const noexcept;
};

/// What the header of a container says of its content. Thread-safety: immutable.
struct LUXContainerForm {
  /// Eight bytes.
  std::string_view magic;
  uint16_t majorVersion = 1;
  uint16_t minorVersion = 0;
};

/// One book's semantic data.
inline constexpr LUXContainerForm LUXIndexForm{"LUXINDEX", 1, 2};

/// Sections in order of type, each type once. docs/formats/lux-index.md describes the bytes.
///
/// Reading takes time in proportion to the number of sections, not to their size, and copies no
/// section: their bytes are slices of what was read. Thread-safety: immutable.
class LUXSectionedData {
 public:
  static constexpr uint16_t majorVersion = LUXIndexForm.majorVersion;
  static constexpr uint16_t minorVersion = LUXIndexForm.minorVersion;
  static constexpr size_t maximumSectionCount = 64;

  /// The sections of `data`; absent when it is no container of this form, of another major version,
  /// torn, or followed by bytes that do not belong to it. Never throws for bad input.
  static std::optional<LUXSectionedData> read(const platform::Data& data,
                                              const LUXContainerForm& form = LUXIndexForm);

  /// New content of the present version. The sections are put in order of type. Throws
  /// platform::Exception "InvalidArgumentException" for a type that occurs twice and for more than
  /// maximumSectionCount sections.
  explicit LUXSectionedData(std::vector<LUXSection> sections,
                            const LUXContainerForm& form = LUXIndexForm);

  /// The section of a type, null when there is none. Valid as long as this object lives.
  const LUXSection* sectionWithType(uint32_t type) const noexcept;

  const std::vector<LUXSection>& sections() const noexcept { return _sections; }

  /// The bytes: sections in order of type, nothing between them but alignment. Checksums are
  /// written as they are, not made anew, so that damage stays visible; the minor version is kept,
  /// so that sections which only later versions know survive being read and written here.
  platform::Data write() const;

 private:
  explicit LUXSectionedData(const LUXContainerForm& form) : _form(form) {}

  LUXContainerForm _form;
  std::vector<LUXSection> _sections;
};
