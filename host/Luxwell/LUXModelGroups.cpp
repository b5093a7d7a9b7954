#include "host/Luxwell/LUXModelGroups.h"

#include <limits>

#include "platform/PropertyList.h"

namespace {

constexpr const char* defaultGroupKey = "DefaultGroup";
constexpr const char* groupsKey = "Groups";
constexpr const char* booksKey = "Books";
constexpr const char* weightKey = "Weight";
constexpr const char* smoothingOnlyKey = "SmoothingOnly";

float weightOf(const platform::Value& entry) {
  const double weight = entry[weightKey].doubleValue();
  // The comparisons leave out what is not a number as well.
  return weight > 0 && weight <= std::numeric_limits<float>::max() ? static_cast<float>(weight) : 0;
}

bool isName(const std::string& name) {
  return !name.empty() && name.size() <= LUXModelGroups::maximumNameLength;
}

}  // namespace

LUXModelGroups::LUXModelGroups(const platform::Value& list) {
  if (const std::string* name = list[defaultGroupKey].stringIf();
      name != nullptr && isName(*name)) {
    _defaultGroup = *name;
  }
  const auto* groups = list[groupsKey].dictionaryIf();
  if (groups == nullptr) {
    return;
  }
  for (const auto& [name, entry] : *groups) {
    if (!isName(name) || entry.dictionaryIf() == nullptr) {
      continue;
    }
    if (_groups.size() == maximumGroupCount) {
      break;
    }
    Group& group = _groups[name];
    group.weight = weightOf(entry);
    const auto* books = entry[booksKey].dictionaryIf();
    if (books == nullptr) {
      continue;
    }
    for (const auto& [bookID, properties] : *books) {
      if (!isName(bookID)) {
        continue;
      }
      const bool isSmoothingOnly = properties[smoothingOnlyKey].boolValue();
      group.books[bookID] = {weightOf(properties), isSmoothingOnly};
      const auto known = _groupsOfBooks.find(bookID);
      if (known == _groupsOfBooks.end()) {
        _groupsOfBooks.emplace(bookID, name);
      } else if (!isSmoothingOnly && _book(bookID, known->second)->isSmoothingOnly) {
        known->second = name;
      }
    }
  }
}

std::optional<platform::Value> LUXModelGroups::listFromData(const platform::Data& data) {
  std::optional<platform::Value> list = platform::propertyListFromData(data);
  return list && list->dictionaryIf() != nullptr ? std::move(list) : std::nullopt;
}

std::vector<std::string> LUXModelGroups::names() const {
  std::set<std::string> names{_defaultGroup};
  for (const auto& group : _groups) {
    names.insert(group.first);
  }
  return {names.begin(), names.end()};
}

const LUXModelGroups::Group* LUXModelGroups::_group(std::string_view name) const {
  const auto found = _groups.find(name);
  return found == _groups.end() ? nullptr : &found->second;
}

const LUXModelGroups::Book* LUXModelGroups::_book(std::string_view bookID,
                                                  std::string_view group) const {
  const Group* known = _group(group);
  if (known == nullptr) {
    return nullptr;
  }
  const auto found = known->books.find(bookID);
  return found == known->books.end() ? nullptr : &found->second;
}

const std::string& LUXModelGroups::groupOfBook(std::string_view bookID) const {
  const auto found = _groupsOfBooks.find(bookID);
  return found == _groupsOfBooks.end() ? _defaultGroup : found->second;
}

float LUXModelGroups::weightOfGroup(std::string_view group) const {
  const Group* known = _group(group);
  return known == nullptr ? 0 : known->weight;
}

float LUXModelGroups::weightOfBook(std::string_view bookID) const {
  const Book* book = _book(bookID, groupOfBook(bookID));
  return book == nullptr ? 0 : book->weight;
}

platform::Value LUXModelGroups::propertiesOfBook(std::string_view bookID,
                                                 std::string_view group) const {
  platform::Value::Dictionary properties;
  if (const Book* book = _book(bookID, group)) {
    if (book->isSmoothingOnly) {
      properties.emplace(smoothingOnlyKey, true);
    }
    if (book->weight > 0) {
      properties.emplace(weightKey, static_cast<double>(book->weight));
    }
  }
  return properties;
}

std::set<std::string> LUXModelGroups::booksOfGroup(std::string_view group,
                                                   bool includeSmoothingBooks) const {
  std::set<std::string> books;
  if (const Group* known = _group(group)) {
    for (const auto& [bookID, book] : known->books) {
      if (includeSmoothingBooks || !book.isSmoothingOnly) {
        books.insert(bookID);
      }
    }
  }
  return books;
}
