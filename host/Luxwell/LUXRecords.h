// Sections that are made of one record for each document.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"

/// Reads the records of a section in place. Thread-safety: immutable.
class LUXRecords {
 public:
  /// No records.
  LUXRecords() = default;

  /// The records of a section (docs/formats/lux-index.md); none where its offsets are not in order
  /// or lie outside it. Looks at every offset once.
  explicit LUXRecords(const platform::Data& section);

  size_t count() const noexcept { return _count; }

  /// A record that is there. Lives as long as the bytes of the section.
  std::string_view operator[](size_t i) const noexcept;

 private:
  size_t _count = 0;
  platform::Data _offsets;
  platform::Data _bytes;
};

/// Writes such a section. Thread-safety: confined to one thread.
class LUXRecordsWriter {
 public:
  /// Where the bytes of the next record go: they are appended. Valid until the next call.
  std::string& beginRecord() {
    _offsets.push_back(_bytes.size());
    return _bytes;
  }

  /// As beginRecord() gave it last.
  std::string& record() noexcept { return _bytes; }

  /// Bytes of records so far.
  size_t length() const noexcept { return _bytes.size(); }
  /// Makes room for so many bytes of records in all, and no more.
  void reserve(size_t length) { _bytes.reserve(length); }

  /// Adds the records of another writer, which is empty afterwards.
  void append(LUXRecordsWriter& other);

  /// The section. Throws platform::Exception "InvalidArgumentException" when it has 4 GiB or more.
  platform::Data finish();

 private:
  std::vector<uint64_t> _offsets;
  std::string _bytes;
};
