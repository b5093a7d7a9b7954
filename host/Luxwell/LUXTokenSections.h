// The tokens of a book while its data are made, and the sections that they become.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "host/Luxwell/LUXRecords.h"
#include "host/Luxwell/LUXTokenCounts.h"

/// Puts the tokens of a book, which the caller has numbered in any order, in the order of their
/// names, and writes the counts of one page after the other. Nothing is kept of a page but its
/// bytes: books have far more counts than tokens. Thread-safety: confined to one thread.
class LUXTokenSections {
 public:
  using Names = std::array<std::vector<std::string>, LUXTokenKindCount>;

  /// The names of each kind's tokens, by the caller's numbers; tokens of one name become one.
  explicit LUXTokenSections(Names names);

  /// Pages that follow one another. Several may be written at the same time, each in a thread of
  /// its own. Thread-safety: confined to one thread.
  class Pages {
   public:
    /// The sections must outlive the pages.
    explicit Pages(const LUXTokenSections& sections) : _sections(sections) {}

    /// Adds to the counts of a token in the page that is being written; it begins at the least of
    /// the places that it is added with.
    void add(LUXTokenKind kind, uint32_t token, uint32_t titleCount, uint32_t bodyCount,
             uint8_t wordsBefore = LUXTokenCount::farDown) {
      _page.push_back({_sections._numbers[static_cast<size_t>(kind)][token], titleCount, bodyCount,
                       wordsBefore});
    }

    /// Writes the page to which add() has added; the next one begins.
    void endPage();

   private:
    friend class LUXTokenSections;

    const LUXTokenSections& _sections;
    std::vector<LUXTokenCounts::Entry> _page;
    LUXRecordsWriter _records;
    LUXRecordsWriter _places;
  };

  /// Adds pages behind those that are there; they are not used afterwards.
  void append(Pages& pages);

  /// The bytes of the three sections, when all pages are written.
  platform::Data tokenBytes() const { return _table->sectionBytes(); }
  platform::Data countBytes() { return _records.finish(); }
  platform::Data placeBytes() { return _places.finish(); }

 private:
  /// By kind and the caller's number, the number in the table.
  std::array<std::vector<uint32_t>, LUXTokenKindCount> _numbers;
  std::shared_ptr<const LUXTokenTable> _table;
  LUXRecordsWriter _records;
  LUXRecordsWriter _places;
};
