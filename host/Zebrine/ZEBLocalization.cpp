#include "host/Zebrine/ZEBLocalization.h"

#include <map>

namespace {

std::string normalized(std::string_view tag) {
  std::string result(tag.substr(0, tag.find_first_of(".@")));
  for (char& c : result) {
    if (c == '-') {
      c = '_';
    } else if (c >= 'A' && c <= 'Z') {
      c = static_cast<char>(c | 0x20);
    }
  }
  return result;
}

using Names = std::map<std::string, std::string>;

const std::string* nameForLanguage(const Names& names, std::string_view language) {
  std::string tag = normalized(language);
  const bool isOnePart = tag.find('_') == std::string::npos;
  while (!tag.empty()) {
    if (const auto found = names.find(tag); found != names.end()) {
      return &found->second;
    }
    const size_t lastPart = tag.rfind('_');
    if (lastPart == std::string::npos) {
      break;
    }
    tag.resize(lastPart);
  }
  if (isOnePart && !tag.empty()) {
    tag += '_';
    const auto found = names.lower_bound(tag);
    if (found != names.end() && found->first.starts_with(tag)) {
      return &found->second;
    }
  }
  return nullptr;
}

}  // namespace

std::optional<std::string> ZEBBestLocalization(std::span<const std::string> available,
                                               std::span<const std::string> preferredLanguages,
                                               std::string_view developmentLanguage) {
  Names names;
  for (const std::string& name : available) {
    names.emplace(normalized(name), name);
  }
  if (names.empty()) {
    return std::nullopt;
  }
  for (const std::string& language : preferredLanguages) {
    if (const std::string* name = nameForLanguage(names, language)) {
      return *name;
    }
  }
  for (const std::string_view language : {developmentLanguage, std::string_view("en")}) {
    if (const std::string* name = nameForLanguage(names, language)) {
      return *name;
    }
  }
  return names.begin()->second;
}
