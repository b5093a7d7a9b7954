// What the user typed, understood.
#pragma once

#include <algorithm>
#include <cstddef>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "zeb/Console.h"

namespace zeb {

/// What the program's exit status says.
enum class ExitCode : int {
  /// Something was found, or the work is done.
  success = 0,
  nothingFound = 1,
  /// The command line is wrong; nothing was done.
  usage = 2,
  failure = 3,
};

/// Whether a command waits for indexes that are being made, and for how long.
struct Waiting {
  bool waits = true;
  /// Seconds.
  double limit = 300;

  /// Seconds for what is waited for in any case, such as books being looked for.
  double patience() const { return std::max(Waiting().limit, limit); }
};

/// More results than these nobody can ask for, and longer texts, in bytes: the daemon's bounds.
inline constexpr size_t maximumLimit = 10'000;
inline constexpr size_t maximumTextLength = 4096;

struct SearchCommand {
  /// None: the user is asked, on a terminal.
  std::vector<std::string> words;
  /// Only these books; all where there is none.
  std::vector<std::string> books;
  size_t limit = 10;
  bool json = false;
  /// Pages by meaning alone, as for things to do.
  bool actions = false;
};

/// Completions of a text, or searches like the words.
struct SuggestCommand {
  enum class Kind { completions, similar };
  Kind kind = Kind::completions;
  std::vector<std::string> words;
  std::vector<std::string> books;
  size_t limit = 10;
  bool json = false;
};

struct ModelsCommand {
  bool json = false;
};

struct AnchorCommand {
  std::string name;
  std::vector<std::string> books;
  bool json = false;
};

struct BooksCommand {
  bool json = false;
};

/// Books, models, the daemon, and what is being done.
struct StatusCommand {
  bool json = false;
};

/// Pages as they are found, now and later.
struct WatchCommand {
  std::vector<std::string> words;
  std::vector<std::string> books;
  bool json = false;
  /// Only now.
  bool once = false;
};

struct IndexCommand {
  std::vector<std::string> folders;
  /// None, or one a folder.
  std::vector<std::string> bookIDs;
};

struct ScanCommand {
  std::vector<std::string> folders;
  /// Where the computer's installed books are looked for.
  std::string root = "/";
  bool installedBooks = true;
  /// In place of the user's; best first.
  std::vector<std::string> languages;
  bool evenIfUnchanged = false;
};

/// Subscribes to a publisher's catalogue.
struct AddCommand {
  std::string url;
  /// Only these of its books; all where there is none.
  std::vector<std::string> books;
  /// In place of the user's; best first.
  std::vector<std::string> languages;
};

struct RemoveCommand {
  /// Identifiers of books, and URLs of catalogues.
  std::vector<std::string> names;
};

/// Writes books into a folder for a web server.
struct PublishCommand {
  std::vector<std::string> folders;
  /// None, or one a folder.
  std::vector<std::string> bookIDs;
  std::string site;
  /// Of folders that do not say themselves.
  std::string language;
};

/// Says what is wrong.
struct DoctorCommand {
  /// Of the books only these; all where there is none.
  std::vector<std::string> books;
  /// Whether servers are asked, too.
  bool asksServers = false;
  bool json = false;
};

struct CommandLine {
  std::variant<SearchCommand, SuggestCommand, AnchorCommand, BooksCommand, ModelsCommand,
               StatusCommand, WatchCommand, IndexCommand, ScanCommand, AddCommand, RemoveCommand,
               PublishCommand, DoctorCommand>
      command;
  ColorMode color = ColorMode::automatic;
  /// The caches folder, for indexes and the catalogue, when the user names one.
  std::optional<std::string> cacheFolder;
  /// Whether the help daemon is asked, where there is one.
  bool usesDaemon = true;
  Waiting waiting;
  int verbosity = 0;
};

/// The command line behind `arguments` (the program's name not among them). Absent when there is
/// nothing left to do: help or version were asked for and have been printed, or the line is wrong
/// and that has been said; `exitCode` is then set.
///
/// Words of a search may begin with one hyphen, as the query language has it; arguments that begin
/// with two are options, and behind "--" everything is a word.
std::optional<CommandLine> parseCommandLine(const std::vector<std::string>& arguments,
                                            Console& console, ExitCode& exitCode);

}  // namespace zeb
