// How often each token occurs in one page.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"

enum class LUXTokenKind : uint8_t {
  /// The stem of a word that is no stop word.
  stem = 0,
  /// Two stems that follow one another, joined by one blank; stop words and punctuation between
  /// two words keep them apart.
  bigram = 1,
  /// The folded form of a word, stop words too, and of a name that is made of several ("os.path").
  form = 2,
  /// What can be shown as a suggestion: one to four words that follow one another without
  /// punctuation between them, as a person reads them, with no stop word at either end.
  phrase = 3,
  /// The whole title, once for each page: HelpTokenizer::tokenizedStringFromString() of it. Titles
  /// longer than LUXTokenTable::maximumTokenLength have none.
  title = 4,
};

inline constexpr size_t LUXTokenKindCount = 5;

/// One token of a page. `token` lives as long as the table that it comes from.
struct LUXTokenCount {
  /// The most that `wordsBefore` says: so far down or farther, or nobody knows.
  static constexpr uint8_t farDown = 255;

  std::string_view token;
  LUXTokenKind kind = LUXTokenKind::stem;
  /// In the page's title.
  uint32_t titleCount = 0;
  /// Everywhere else.
  uint32_t bodyCount = 0;
  /// How many words of the page, its title left out, come before the last word of the token's first
  /// occurrence; 0 for a token of the title. Known of stems, bigrams and forms.
  uint8_t wordsBefore = farDown;

  friend bool operator==(const LUXTokenCount&, const LUXTokenCount&) = default;
};

/// The tokens of a whole book, each once, numbered from 0 in order of kind, then of bytes.
/// Thread-safety: immutable.
class LUXTokenTable {
 public:
  /// In bytes.
  static constexpr size_t maximumTokenLength = 1100;

  struct Token {
    LUXTokenKind kind;
    /// Lives as long as the table.
    std::string_view token;
  };

  size_t size() const noexcept { return _offsets.empty() ? 0 : _offsets.size() - 1; }
  Token tokenAt(size_t number) const noexcept;
  /// The numbers of a kind's tokens are those from here to the start of the next kind's.
  uint32_t startOfKind(LUXTokenKind kind) const noexcept {
    return _kindStarts[static_cast<size_t>(kind)];
  }

  /// `tokens` are those of one kind after the other, each list strictly ascending.
  static std::shared_ptr<const LUXTokenTable> withTokens(
      const std::array<std::vector<std::string>, LUXTokenKindCount>& tokens);

  /// The bytes of a token section (docs/formats/lux-index.md), and back. Absent for bytes that are
  /// none.
  platform::Data sectionBytes() const;
  static std::shared_ptr<const LUXTokenTable> withSectionBytes(const platform::Data& bytes);

 private:
  LUXTokenTable() = default;

  std::string _text;
  std::vector<uint32_t> _offsets;
  std::array<uint32_t, LUXTokenKindCount + 1> _kindStarts{};
};

/// The tokens of one page with their counts, in order of kind, then of bytes. Copies share what
/// they hold, and keep the book's table alive. Thread-safety: immutable.
class LUXTokenCounts {
 public:
  /// A token by its number in the table.
  struct Entry {
    uint32_t number = 0;
    uint32_t titleCount = 0;
    uint32_t bodyCount = 0;
    uint8_t wordsBefore = LUXTokenCount::farDown;
  };

  /// No tokens.
  LUXTokenCounts();
  /// Entries in strictly ascending order of numbers that the table has.
  LUXTokenCounts(std::shared_ptr<const LUXTokenTable> table, std::vector<Entry> entries);

  /// Counts with a table of their own, in any order; the counts of a token that occurs twice are
  /// added, and it begins where the earlier one does.
  static LUXTokenCounts withCounts(const std::vector<LUXTokenCount>& counts);

  size_t size() const noexcept { return _entries->size(); }
  bool empty() const noexcept { return _entries->empty(); }

  LUXTokenCount operator[](size_t i) const noexcept;
  /// The number of the i-th token in the book's table.
  uint32_t tokenNumber(size_t i) const noexcept { return (*_entries)[i].number; }

  /// The table of the book, one object for all pages that are read while it lives. Never null.
  const std::shared_ptr<const LUXTokenTable>& table() const noexcept { return _table; }

 private:
  std::shared_ptr<const LUXTokenTable> _table;
  std::shared_ptr<const std::vector<Entry>> _entries;
};
