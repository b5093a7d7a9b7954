#include "host/Luxwell/HelpLUXModel.h"

#include <limits>
#include <utility>

#include "platform/ThreadSafety.h"

namespace {

constexpr const char* defaultGroupKey = "DefaultGroup";
constexpr const char* groupsKey = "Groups";
constexpr const char* booksKey = "Books";
constexpr const char* weightKey = "Weight";

struct GroupList {
  platform::Mutex mutex;
  platform::Value list GUARDED_BY(mutex);
};

GroupList& groupList() {
  // Never destroyed: background work may still ask while the process ends.
  static GroupList& list = *new GroupList;
  return list;
}

platform::Value currentList() {
  const platform::MutexLock lock(groupList().mutex);
  return groupList().list;
}

float weightOf(const platform::Value& entry) {
  const double weight = entry[weightKey].doubleValue();
  // The comparisons leave out what is not a number as well.
  return weight > 0 && weight <= std::numeric_limits<float>::max() ? static_cast<float>(weight) : 0;
}

}  // namespace

void HelpLUXModel::setGroupList(platform::Value list) {
  const platform::MutexLock lock(groupList().mutex);
  groupList().list = std::move(list);
}

std::string HelpLUXModel::modelGroupNameForHelpbookID(std::string_view helpbookID) {
  const platform::Value list = currentList();
  if (const auto* groups = list[groupsKey].dictionaryIf()) {
    for (const auto& group : *groups) {
      if (!group.second[booksKey][helpbookID].isAbsent()) {
        return group.first;
      }
    }
  }
  return list[defaultGroupKey].stringValue().value_or("Default");
}

float HelpLUXModel::combiningWeightForModelGroupName(std::string_view modelGroupName) {
  const platform::Value list = currentList();
  return weightOf(list[groupsKey][modelGroupName]);
}

float HelpLUXModel::combiningWeightForHelpbookID(std::string_view helpbookID) {
  const platform::Value list = currentList();
  if (const auto* groups = list[groupsKey].dictionaryIf()) {
    for (const auto& group : *groups) {
      const platform::Value& book = group.second[booksKey][helpbookID];
      if (!book.isAbsent()) {
        return weightOf(book);
      }
    }
  }
  return 0;
}
