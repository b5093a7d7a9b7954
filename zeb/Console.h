// Where the program writes, and whether it may use colours there.
#pragma once

#include <iosfwd>
#include <string>
#include <string_view>

namespace zeb {

enum class ColorMode { automatic, always, never };

/// What an output may look like on a terminal.
enum class Style { title, book, url, label, error };

/// The text on one line and free of control characters, so that what a help page or a file name
/// says can neither move the cursor nor imitate other output: ill-formed UTF-8 becomes U+FFFD, runs
/// of blanks, line breaks and control characters become one blank, and blanks at the ends go.
std::string singleLine(std::string_view text);

/// Results on one stream, messages on another.
///
/// Colours follow setColorMode(); left to itself the results are coloured when they go to a
/// terminal and the user has not asked for no colours by the NO_COLOR variable.
/// Thread-safety: confined to one thread at a time.
class Console {
 public:
  /// The streams must outlive the console.
  Console(std::ostream& out, std::ostream& err) : _out(out), _err(err) {}

  void setOutIsTerminal(bool isTerminal) { _outIsTerminal = isTerminal; }
  void setInIsTerminal(bool isTerminal) { _inIsTerminal = isTerminal; }
  void setErrIsTerminal(bool isTerminal) { _errIsTerminal = isTerminal; }
  void setColorsUnwanted(bool unwanted) { _colorsUnwanted = unwanted; }
  void setColorMode(ColorMode mode) { _colorMode = mode; }

  /// Whether somebody can type and see what is answered.
  bool isInteractive() const { return _inIsTerminal && _outIsTerminal; }

  std::ostream& out() { return _out; }
  std::ostream& err() { return _err; }

  /// The text in a style where results are coloured, else the text.
  std::string styled(Style style, std::string_view text) const;

  /// "zeb: error: …" and "zeb: warning: …", made single lines.
  void error(std::string_view text);
  void warning(std::string_view text);
  /// "zeb: …".
  void note(std::string_view text);

  /// Shows what is going on, on one line that the next message or progress replaces. Shows nothing
  /// where messages do not go to a terminal.
  void progress(std::string_view text);
  void clearProgress();

  /// Writes out what is buffered; false when results could not be written.
  bool flush();

 private:
  bool _colored(bool isTerminal) const;
  void _message(std::string_view kind, std::string_view text);

  std::ostream& _out;
  std::ostream& _err;
  bool _inIsTerminal = false;
  bool _outIsTerminal = false;
  bool _errIsTerminal = false;
  bool _colorsUnwanted = false;
  bool _progressShown = false;
  ColorMode _colorMode = ColorMode::automatic;
};

}  // namespace zeb
