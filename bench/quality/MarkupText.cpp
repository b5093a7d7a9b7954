#include "bench/quality/MarkupText.h"

#include <array>
#include <utility>

namespace quality {

std::string collapsed(std::string_view text) {
  std::string result;
  bool blank = false;
  for (const char c : text) {
    if (c == ' ' || c == '\t' || c == '\n' || c == '\r') {
      blank = !result.empty();
    } else {
      if (blank) {
        result += ' ';
        blank = false;
      }
      result += c;
    }
  }
  return result;
}

std::string plainText(std::string_view markup) {
  static constexpr std::array<std::pair<std::string_view, char>, 7> entities = {{{"&amp;", '&'},
                                                                                 {"&lt;", '<'},
                                                                                 {"&gt;", '>'},
                                                                                 {"&quot;", '"'},
                                                                                 {"&apos;", '\''},
                                                                                 {"&#39;", '\''},
                                                                                 {"&nbsp;", ' '}}};
  std::string result;
  while (!markup.empty()) {
    if (markup.front() == '<') {
      const size_t end = markup.find('>');
      markup.remove_prefix(end == std::string_view::npos ? markup.size() : end + 1);
      continue;
    }
    if (markup.front() == '\\' && markup.size() > 1) {
      markup.remove_prefix(1);
    }
    bool isEntity = false;
    for (const auto& [name, character] : entities) {
      if (markup.starts_with(name)) {
        result += character;
        markup.remove_prefix(name.size());
        isEntity = true;
        break;
      }
    }
    if (!isEntity) {
      result += markup.front();
      markup.remove_prefix(1);
    }
  }
  return collapsed(result);
}

std::vector<IndexTerm> termsOfIndexPage(std::string_view markup) {
  std::vector<IndexTerm> terms;
  // The term of the moment at each depth of lists.
  std::vector<std::string> path;
  size_t position = 0;
  while ((position = markup.find('<', position)) != std::string_view::npos) {
    const std::string_view rest = markup.substr(position);
    if (rest.starts_with("<dl")) {
      path.emplace_back();
    } else if (rest.starts_with("</dl>") && !path.empty()) {
      path.pop_back();
    } else if (rest.starts_with("<dt") && !path.empty()) {
      const std::string_view entry = rest.substr(0, rest.find("</dt>"));
      const size_t firstLink = entry.find("<a ");
      std::string text = plainText(entry.substr(0, firstLink));
      if (text.ends_with(',')) {
        text.pop_back();
      }
      path.back() = text;
      IndexTerm term;
      for (const std::string& part : path) {
        term.text += (term.text.empty() ? "" : " ") + part;
      }
      static constexpr std::string_view linkMark = "class=\"indexterm\" href=\"";
      for (size_t link = entry.find(linkMark); link != std::string_view::npos;
           link = entry.find(linkMark, link + 1)) {
        const size_t start = link + linkMark.size();
        term.links.emplace_back(entry.substr(start, entry.find('"', start) - start));
      }
      if (!term.links.empty()) {
        terms.push_back(std::move(term));
      }
    }
    ++position;
  }
  return terms;
}

}  // namespace quality
