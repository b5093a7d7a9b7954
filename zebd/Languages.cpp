#include "zebd/Languages.h"

#include <algorithm>

#include "platform/Strings.h"

namespace zebd {

namespace {

std::string folderSpelling(std::string tag) {
  std::replace(tag.begin(), tag.end(), '-', '_');
  return tag;
}

void appendOnce(std::vector<std::string>& list, const std::string& language) {
  if (!language.empty() && std::find(list.begin(), list.end(), language) == list.end()) {
    list.push_back(language);
  }
}

std::string comparable(const std::string& language) {
  return platform::lowercaseString(folderSpelling(language));
}

}  // namespace

std::vector<std::string> languageFallbacks(const std::vector<std::string>& preferredLanguages) {
  std::vector<std::string> fallbacks;
  for (const std::string& preferred : preferredLanguages) {
    std::string language = folderSpelling(preferred);
    appendOnce(fallbacks, language);
    for (size_t cut = language.rfind('_'); cut != std::string::npos; cut = language.rfind('_')) {
      language.resize(cut);
      appendOnce(fallbacks, language);
    }
    if (language == "en") {
      appendOnce(fallbacks, "C");
    }
  }
  appendOnce(fallbacks, "en");
  appendOnce(fallbacks, "C");
  return fallbacks;
}

std::optional<std::string> bestLanguage(const std::vector<std::string>& folders,
                                        const std::vector<std::string>& fallbacks) {
  for (const std::string& language : fallbacks) {
    const std::string wanted = comparable(language);
    for (const std::string& folder : folders) {
      if (comparable(folder) == wanted) {
        return folder;
      }
    }
  }
  for (const std::string& language : fallbacks) {
    const std::string prefix = comparable(language) + '_';
    for (const std::string& folder : folders) {
      if (comparable(folder).starts_with(prefix)) {
        return folder;
      }
    }
  }
  return std::nullopt;
}

}  // namespace zebd
