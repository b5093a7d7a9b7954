// Which books are searched together.
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"
#include "platform/Value.h"

/// A group list, taken apart. docs/formats/group-list.md describes the property list:
///
///     {"DefaultGroup": "Applications",
///      "Groups": {"System": {"Weight": 1.5,
///                            "Books": {"org.zeb.manual": {"Weight": 2.0},
///                                      "org.zeb.glossary": {"SmoothingOnly": true}}}}}
///
/// A book may be named by several groups. It belongs to the first of them, by bytes of the names,
/// in which it is not there for smoothing only; to the first of them all where there is none; to
/// the default group when no group names it. What is not of this form counts as not there: a
/// damaged list never keeps a book from being found.
///
/// Identifiers are taken as they are, versions included. Thread-safety: immutable.
class LUXModelGroups {
 public:
  static constexpr const char* nameOfDefaultGroup = "Default";
  /// What a damaged list could make of memory is kept within bounds: groups beyond this number, by
  /// bytes of the names, and names longer than this count as not there.
  static constexpr size_t maximumGroupCount = 1000;
  static constexpr size_t maximumNameLength = 255;

  /// The default group alone.
  LUXModelGroups() = default;
  explicit LUXModelGroups(const platform::Value& list);

  /// Absent for what is no property list of a dictionary.
  static std::optional<platform::Value> listFromData(const platform::Data& data);

  const std::string& defaultGroup() const noexcept { return _defaultGroup; }
  /// All groups, the default one too, each once, in order of bytes.
  std::vector<std::string> names() const;

  const std::string& groupOfBook(std::string_view bookID) const;
  /// 0 where none is given.
  float weightOfGroup(std::string_view group) const;
  /// The weight that the book has in the group that it belongs to; 0 where none is given.
  float weightOfBook(std::string_view bookID) const;
  /// What the group says of the book: a dictionary with "SmoothingOnly" where it is true and
  /// "Weight" where there is one; empty for a book that the group does not name.
  platform::Value propertiesOfBook(std::string_view bookID, std::string_view group) const;
  /// The books that the group names, those for smoothing only if wanted.
  std::set<std::string> booksOfGroup(std::string_view group, bool includeSmoothingBooks) const;

 private:
  struct Book {
    float weight = 0;
    bool isSmoothingOnly = false;
  };
  struct Group {
    float weight = 0;
    std::map<std::string, Book, std::less<>> books;
  };

  const Group* _group(std::string_view name) const;
  const Book* _book(std::string_view bookID, std::string_view group) const;

  std::string _defaultGroup = nameOfDefaultGroup;
  std::map<std::string, Group, std::less<>> _groups;
  std::map<std::string, std::string, std::less<>> _groupsOfBooks;
};
