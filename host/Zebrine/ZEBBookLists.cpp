#include "host/Zebrine/ZEBBookLists.h"

std::optional<std::string> ZEBExactMatchAnchor(const platform::Value& list,
                                               std::string_view normalizedQuery) {
  return list[normalizedQuery].stringValue();
}

std::vector<std::string> ZEBSuggestionsWithPrefix(const platform::Value& list,
                                                  std::string_view prefix) {
  std::vector<std::string> texts;
  const platform::Value::Dictionary* entries = list.dictionaryIf();
  if (entries == nullptr) {
    return texts;
  }
  for (auto entry = entries->lower_bound(prefix);
       entry != entries->end() && entry->first.starts_with(prefix); ++entry) {
    if (const platform::Value::Dictionary* suggestions = entry->second.dictionaryIf()) {
      for (const auto& [text, anchor] : *suggestions) {
        texts.push_back(text);
      }
    }
  }
  return texts;
}

std::optional<std::string> ZEBSuggestionAnchor(const platform::Value& list,
                                               std::string_view query) {
  return list[query][query].stringValue();
}
