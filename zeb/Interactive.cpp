#include "zeb/Interactive.h"

#include <algorithm>
#include <utility>

#include "platform/RunLoop.h"
#include "platform/Strings.h"
#include "zeb/Console.h"
#include "zeb/InputWatcher.h"
#include "zebd/Host.h"

namespace zeb {

namespace {

constexpr const char* promptText = "search: ";
constexpr size_t completionLimit = 5;
constexpr size_t pageLimit = 8;

void removeLastCharacter(std::string& text) {
  while (!text.empty() && (static_cast<unsigned char>(text.back()) & 0xC0U) == 0x80U) {
    text.pop_back();
  }
  if (!text.empty()) {
    text.pop_back();
  }
}

void removeLastWord(std::string& text) {
  while (!text.empty() && text.back() == ' ') {
    text.pop_back();
  }
  while (!text.empty() && text.back() != ' ') {
    text.pop_back();
  }
}

}  // namespace

SearchPrompt::Outcome SearchPrompt::press(const Key& key) {
  switch (key.kind) {
    case Key::Kind::text:
      _text += platform::stringByRepairingUTF8(key.text);
      break;
    case Key::Kind::backspace:
      removeLastCharacter(_text);
      break;
    case Key::Kind::deleteWord:
      removeLastWord(_text);
      break;
    case Key::Kind::deleteLine:
      _text.clear();
      break;
    case Key::Kind::down:
      if (_itemCount() > 0) {
        _selected = _selected ? std::min(*_selected + 1, _itemCount() - 1) : 0;
      }
      return Outcome::stays;
    case Key::Kind::up:
      _selected = _selected && *_selected > 0 ? std::optional(*_selected - 1) : std::nullopt;
      return Outcome::stays;
    case Key::Kind::tab:
      if (!_selected && !_answer.completions.empty()) {
        _selected = 0;
      }
      return _selected && selectedPage() == nullptr ? _choose() : Outcome::stays;
    case Key::Kind::enter:
      return _choose();
    case Key::Kind::escape:
    case Key::Kind::end:
      return Outcome::leaves;
  }
  _selected.reset();
  return Outcome::textChanged;
}

/// Enter on a completion takes it; on a page opens it; on the text itself opens the best page.
SearchPrompt::Outcome SearchPrompt::_choose() {
  if (!_selected) {
    if (_answer.pages.empty()) {
      return Outcome::stays;
    }
    _selected = _answer.completions.size();
    return Outcome::opensPage;
  }
  if (selectedPage() != nullptr) {
    return Outcome::opensPage;
  }
  _text = _answer.completions[*_selected].text;
  _selected.reset();
  return Outcome::textChanged;
}

void SearchPrompt::show(LiveAnswer answer) {
  // What the user has gone to stays under the hand: a list that grows meanwhile must not change it.
  const bool keepsSelection = _selected && answer.completions.size() == _answer.completions.size();
  _answer = std::move(answer);
  if (!keepsSelection || (_selected && *_selected >= _itemCount())) {
    _selected.reset();
  }
}

const FoundPage* SearchPrompt::selectedPage() const {
  if (!_selected || *_selected < _answer.completions.size() || *_selected >= _itemCount()) {
    return nullptr;
  }
  return &_answer.pages[*_selected - _answer.completions.size()];
}

std::vector<std::string> SearchPrompt::lines(size_t columns, size_t rows) const {
  std::vector<std::string> lines = {promptText + singleLine(_text)};
  const auto add = [&](size_t item, const std::string& text) {
    lines.push_back((_selected == item ? "> " : "  ") + text);
  };
  size_t item = 0;
  for (const Suggestion& completion : _answer.completions) {
    add(item++, singleLine(completion.text));
  }
  for (const FoundPage& page : _answer.pages) {
    add(item++, singleLine(page.title) + "  \xC2\xB7  " + singleLine(page.bookTitle));
  }
  if (lines.size() > rows) {
    lines.resize(std::max<size_t>(rows, 1));
  }
  for (std::string& line : lines) {
    line = platform::stringByTruncatingToColumns(line, columns);
  }
  return lines;
}

namespace {

/// Draws the prompt's lines over what was drawn before, in one write so that nothing flickers.
class Screen {
 public:
  explicit Screen(Terminal& terminal) : _terminal(terminal) {}

  void draw(const SearchPrompt& prompt) const {
    // One column stays free: a full line would make the terminal begin a new one.
    const std::vector<std::string> lines =
        prompt.lines(_terminal.columns() - 1, _terminal.rows() - 1);
    std::string text = "\r\033[J";
    for (size_t i = 0; i < lines.size(); ++i) {
      text += i == 0 ? "" : "\r\n";
      const bool isSelected = lines[i].starts_with("> ") && i > 0;
      text += isSelected ? "\033[7m" + lines[i] + "\033[0m" : lines[i];
    }
    if (lines.size() > 1) {
      text += "\033[" + std::to_string(lines.size() - 1) + "A";
    }
    // Back to the end of what was typed.
    text += "\r" + lines.front();
    _terminal.write(text);
  }

  void clear() const { _terminal.write("\r\033[J"); }

 private:
  Terminal& _terminal;
};

}  // namespace

void searchInteractively(HelpSearch& search, const std::vector<std::string>& bookIDs,
                         Terminal& terminal,
                         const std::function<void(const std::string&)>& openPage) {
  SearchPrompt prompt;
  const Screen screen(terminal);
  std::shared_ptr<LiveSearch> running;
  InputWatcher watcher(terminal.input(), [] { platform::RunLoop::main()->stop(); });
  screen.draw(prompt);
  const auto begin = [&] {
    if (running != nullptr) {
      running->cancel();
      running.reset();
    }
    if (prompt.text().empty()) {
      prompt.show({});
    } else {
      running = search.beginLiveSearch(prompt.text(), bookIDs);
    }
  };
  while (true) {
    zebd::Host::runMainLoopUntil(
        [&] { return terminal.hasInput() || (running != nullptr && running->ended()); },
        platform::Seconds::max());
    if (running != nullptr && running->ended()) {
      LiveAnswer answer = running->answer(pageLimit);
      running.reset();
      if (answer.completions.size() > completionLimit) {
        answer.completions.resize(completionLimit);
      }
      prompt.show(std::move(answer));
    }
    if (terminal.hasInput()) {
      for (const Key& key : terminal.keys()) {
        switch (prompt.press(key)) {
          case SearchPrompt::Outcome::stays:
            break;
          case SearchPrompt::Outcome::textChanged:
            begin();
            break;
          case SearchPrompt::Outcome::opensPage:
            openPage(prompt.selectedPage()->url);
            break;
          case SearchPrompt::Outcome::leaves:
            screen.clear();
            return;
        }
      }
      watcher.resume();
    }
    screen.draw(prompt);
  }
}

std::string addressForViewer(std::string url) {
  constexpr std::string_view document = "/index.docbook";
  constexpr std::string_view escaped = "%23";
  const size_t found = url.rfind(document);
  if (found != std::string::npos &&
      std::string_view(url).substr(found + document.size()).starts_with(escaped)) {
    url.replace(found + document.size(), escaped.size(), "#");
  }
  return url;
}

}  // namespace zeb
