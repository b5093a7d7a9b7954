#include "zeb/CommandLine.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <map>
#include <ostream>
#include <string_view>

#ifndef ZEB_VERSION
#define ZEB_VERSION "0"
#endif

namespace zeb {

namespace {

/// Put in front of arguments that the parser would take for something else than words: those with
/// one hyphen and those in brackets, which it takes for lists. It is a byte that UTF-8 never has;
/// what begins with it all the same gets another one, so that taking one away is always right.
constexpr char wordMark = '\xFF';

bool isCommand(std::string_view argument) {
  static constexpr std::string_view commands[] = {
      "search", "suggest", "similar", "anchor",  "books",  "models", "index",
      "scan",   "add",     "remove",  "publish", "status", "watch",  "doctor"};
  return std::find(std::begin(commands), std::end(commands), argument) != std::end(commands);
}

bool isOption(std::string_view argument) { return argument.starts_with('-'); }

/// The first argument that stands where a command should; absent when none does.
std::optional<std::string> wordForCommand(const std::vector<std::string>& arguments) {
  for (size_t i = 0; i < arguments.size(); ++i) {
    const std::string& argument = arguments[i];
    if (!isOption(argument)) {
      return argument;
    }
    if (argument == "--color" || argument == "--cache-dir" || argument == "--wait") {
      ++i;
    }
  }
  return std::nullopt;
}

/// The arguments in the order in which the parser wants them, which is from the last to the first,
/// with marks where they are needed.
std::vector<std::string> argumentsForParser(const std::vector<std::string>& arguments) {
  // Behind a command it would be a word.
  if (arguments == std::vector<std::string>{"-h"}) {
    return {"--help"};
  }
  std::vector<std::string> prepared;
  bool onlyWords = false;
  for (const std::string& argument : arguments) {
    const bool isForParser = !onlyWords && argument.starts_with("--");
    const bool isMistakable =
        !argument.empty() && (argument[0] == '-' || argument[0] == '[' || argument[0] == wordMark);
    prepared.push_back(isMistakable && !isForParser ? wordMark + argument : argument);
    onlyWords = onlyWords || argument == "--";
  }
  std::reverse(prepared.begin(), prepared.end());
  return prepared;
}

std::string unmarked(std::string argument) {
  if (argument.starts_with(wordMark)) {
    argument.erase(0, 1);
  }
  return argument;
}

/// The parser's description of this program's command line, and where it leaves what it finds.
struct Parser {
  Parser();

  CLI::App app{"Finds pages in the help books on this computer.", "zeb"};
  CLI::App* search = nullptr;
  CLI::App* suggest = nullptr;
  CLI::App* similar = nullptr;
  CLI::App* anchor = nullptr;
  CLI::App* models = nullptr;
  CLI::App* books = nullptr;
  CLI::App* index = nullptr;
  CLI::App* scan = nullptr;
  CLI::App* add = nullptr;
  CLI::App* remove = nullptr;
  CLI::App* publish = nullptr;
  CLI::App* doctor = nullptr;
  CLI::App* status = nullptr;
  CLI::App* watch = nullptr;

  CommandLine common;
  std::string cacheFolder;
  SearchCommand searchCommand;
  SuggestCommand suggestCommand;
  AnchorCommand anchorCommand;
  ModelsCommand modelsCommand;
  BooksCommand booksCommand;
  IndexCommand indexCommand;
  ScanCommand scanCommand;
  AddCommand addCommand;
  RemoveCommand removeCommand;
  PublishCommand publishCommand;
  DoctorCommand doctorCommand;
  StatusCommand statusCommand;
  WatchCommand watchCommand;
  bool noInstalledBooks = false;
  bool noWait = false;
  bool noDaemon = false;

  /// What is wrong with the command line, in this program's words.
  std::string messageOf(const CLI::ParseError& error) const;

 private:
  CLI::App* _addCommand(const std::string& name, const std::string& description);
  CLI::App* _addSuggestCommand(const std::string& name, const std::string& description);
  void _addCommandsForRemoteBooks();
  void _addDoctor();
  void _addCommandsThatWatch();
};

CLI::App* Parser::_addCommand(const std::string& name, const std::string& description) {
  CLI::App* command = app.add_subcommand(name, description);
  command->fallthrough();
  command->set_help_flag("--help", "Print this and exit");
  return command;
}

CLI::App* Parser::_addSuggestCommand(const std::string& name, const std::string& description) {
  CLI::App* command = _addCommand(name, description);
  command->add_option("words", suggestCommand.words, "The words")
      ->required()
      ->option_text("WORDS...");
  command->add_option("--book", suggestCommand.books, "Only of this book; may be repeated")
      ->allow_extra_args(false)
      ->option_text("ID");
  command->add_option("--limit", suggestCommand.limit, "Show at most this many (10)")
      ->check(CLI::Range(size_t{1}, maximumLimit).description(""))
      ->option_text("N");
  command->add_flag("--json", suggestCommand.json, "Write one JSON object");
  return command;
}

Parser::Parser() {
  const std::map<std::string, ColorMode> colors = {
      {"auto", ColorMode::automatic}, {"always", ColorMode::always}, {"never", ColorMode::never}};
  app.require_subcommand(1);
  app.set_help_flag("--help", "Print this and exit");
  app.set_version_flag("--version", "zeb " ZEB_VERSION);
  app.add_option("--color", common.color, "Colours: auto, always or never")
      ->transform(CLI::CheckedTransformer(colors).description(""))
      ->option_text("WHEN");
  app.add_option("--cache-dir", cacheFolder, "The folder for indexes and the list of books")
      ->envname("ZEB_CACHE_DIR")
      ->option_text("DIR");
  app.add_flag("--no-wait", noWait, "Do not wait for indexes that are being made");
  app.add_flag("--no-daemon", noDaemon, "Search in this process, even where a help daemon runs");
  app.add_option("--wait", common.waiting.limit, "Wait for them at most this long (300)")
      ->check(CLI::Range(0.0, 1e9).description(""))
      ->check([](const std::string& seconds) {
        return seconds.find_first_of("nN") == std::string::npos ? "" : "not a number";
      })
      ->option_text("SECONDS");
  app.add_flag("--verbose", common.verbosity, "Say more; may be repeated");
  app.footer(
      "Exit status: 0 something was found, 1 nothing was found (doctor: something is wrong),\n"
      "2 the command line is wrong, 3 failure.");

  search = _addCommand("search", "Find pages by words or the beginnings of words");
  search->add_option("words", searchCommand.words, "What to look for; asked for without any")
      ->option_text("WORDS...");
  search->add_option("--book", searchCommand.books, "Only in this book; may be repeated")
      ->allow_extra_args(false)
      ->option_text("ID");
  search->add_option("--limit", searchCommand.limit, "Show at most this many pages (10)")
      ->check(CLI::Range(size_t{1}, maximumLimit).description(""))
      ->option_text("N");
  search->add_flag("--actions", searchCommand.actions, "Pages by meaning alone: things to do");
  search->add_flag("--json", searchCommand.json, "Write one JSON object");

  suggest = _addSuggestCommand("suggest", "Complete what is half typed");
  similar = _addSuggestCommand("similar", "Find other searches that lead to such pages");

  anchor = _addCommand("anchor", "Find the pages that carry an anchor");
  anchor->add_option("name", anchorCommand.name, "The anchor, exactly as written")
      ->required()
      ->option_text("NAME");
  anchor->add_option("--book", anchorCommand.books, "Only in this book; may be repeated")
      ->allow_extra_args(false)
      ->option_text("ID");
  anchor->add_flag("--json", anchorCommand.json, "Write one JSON object");

  books = _addCommand("books", "List the books that can be searched");
  books->add_flag("--json", booksCommand.json, "Write one JSON object");

  models = _addCommand("models", "List the language models behind search by meaning");
  models->add_flag("--json", modelsCommand.json, "Write one JSON object");

  index = _addCommand("index", "Index folders and make them books");
  index->add_option("folders", indexCommand.folders, "Folders of help pages")
      ->required()
      ->option_text("FOLDER...");
  index->add_option("--book-id", indexCommand.bookIDs, "Identifier of the book; one a folder")
      ->allow_extra_args(false)
      ->option_text("ID");

  scan = _addCommand("scan", "Index the books that are installed, and the given folders");
  scan->add_option("folders", scanCommand.folders, "Further folders of help pages")
      ->option_text("FOLDER...");
  scan->add_option("--root", scanCommand.root, "Look for installed books below this folder")
      ->option_text("DIR");
  scan->add_flag("--no-system", noInstalledBooks, "Do not look for installed books");
  scan->add_option("--language", scanCommand.languages, "Preferred language; may be repeated")
      ->allow_extra_args(false)
      ->option_text("TAG");
  scan->add_flag("--force", scanCommand.evenIfUnchanged, "Index unchanged books, too");

  _addCommandsForRemoteBooks();
  _addDoctor();
  _addCommandsThatWatch();
}

void Parser::_addCommandsThatWatch() {
  status = _addCommand("status", "Say how things are, and what is being done");
  status->add_flag("--json", statusCommand.json, "Write one JSON object");

  watch = _addCommand("watch", "Print pages as they are found, and as books come and go");
  watch->add_option("words", watchCommand.words, "What to look for")
      ->required()
      ->option_text("WORDS...");
  watch->add_option("--book", watchCommand.books, "Only in this book; may be repeated")
      ->allow_extra_args(false)
      ->option_text("ID");
  watch->add_flag("--once", watchCommand.once, "End when the search has ended");
  watch->add_flag("--json", watchCommand.json, "Write one JSON object a line");
}

void Parser::_addCommandsForRemoteBooks() {
  add = _addCommand("add", "Subscribe to books on a web server");
  add->add_option("url", addCommand.url, "Address of the publisher's catalogue")
      ->required()
      ->option_text("URL");
  add->add_option("--book", addCommand.books, "Only this book; may be repeated")
      ->allow_extra_args(false)
      ->option_text("ID");
  add->add_option("--language", addCommand.languages, "Preferred language; may be repeated")
      ->allow_extra_args(false)
      ->option_text("TAG");

  remove = _addCommand("remove", "Forget books, or all books of a catalogue");
  remove->add_option("names", removeCommand.names, "Identifiers, or addresses of catalogues")
      ->required()
      ->option_text("ID_OR_URL...");

  publish = _addCommand("publish", "Write books into a folder for a web server");
  publish->add_option("folders", publishCommand.folders, "Help books, or folders of help pages")
      ->required()
      ->option_text("FOLDER...");
  publish->add_option("--site", publishCommand.site, "The folder to serve; made when needed")
      ->required()
      ->option_text("DIR");
  publish->add_option("--book-id", publishCommand.bookIDs, "Identifier of the book; one a folder")
      ->allow_extra_args(false)
      ->option_text("ID");
  publish->add_option("--language", publishCommand.language, "Language of folders that do not say")
      ->option_text("TAG");
}

void Parser::_addDoctor() {
  doctor = _addCommand("doctor", "Say why a book is missing or has no index");
  doctor->add_option("books", doctorCommand.books, "Of the books only these")->option_text("ID...");
  doctor->add_flag("--network", doctorCommand.asksServers, "Ask the servers of remote books, too");
  doctor->add_flag("--json", doctorCommand.json, "Write one JSON object");
}

std::string Parser::messageOf(const CLI::ParseError& error) const {
  // The message may name an argument.
  std::string message = error.what();
  std::erase(message, wordMark);
  if (dynamic_cast<const CLI::RequiredError*>(&error) == nullptr) {
    return message;
  }
  const auto given = app.get_subcommands();
  if (given.empty()) {
    return "a command is missing";
  }
  const std::string name = message.substr(0, message.find(' '));
  const CLI::Option* const option = given.front()->get_option_no_throw(name);
  if (option == nullptr) {
    return message;
  }
  return given.front()->get_name() + ": " + (isOption(name) ? name + " " : "") +
         option->get_option_text() + " is missing";
}

void unmark(std::vector<std::string>& arguments) {
  for (std::string& argument : arguments) {
    argument = unmarked(std::move(argument));
  }
}

}  // namespace

std::optional<CommandLine> parseCommandLine(const std::vector<std::string>& arguments,
                                            Console& console, ExitCode& exitCode) {
  Parser parser;
  try {
    parser.app.parse(argumentsForParser(arguments));
  } catch (const CLI::Success& success) {
    parser.app.exit(success, console.out(), console.err());
    exitCode = ExitCode::success;
    return std::nullopt;
  } catch (const CLI::ParseError& error) {
    const std::optional<std::string> word = wordForCommand(arguments);
    if (word && !isCommand(*word)) {
      console.error("there is no command \"" + *word + "\"");
    } else {
      console.error(parser.messageOf(error));
    }
    console.note("'zeb --help' and 'zeb COMMAND --help' say more");
    exitCode = ExitCode::usage;
    return std::nullopt;
  }

  CommandLine line = parser.common;
  if (!parser.cacheFolder.empty()) {
    line.cacheFolder = unmarked(parser.cacheFolder);
  }
  line.waiting.waits = !parser.noWait;
  // A daemon has books and indexes of its own place.
  line.usesDaemon = !parser.noDaemon && !line.cacheFolder;
  if (parser.search->parsed()) {
    unmark(parser.searchCommand.words);
    unmark(parser.searchCommand.books);
    line.command = parser.searchCommand;
  } else if (parser.suggest->parsed() || parser.similar->parsed()) {
    using Kind = SuggestCommand::Kind;
    parser.suggestCommand.kind = parser.suggest->parsed() ? Kind::completions : Kind::similar;
    unmark(parser.suggestCommand.words);
    unmark(parser.suggestCommand.books);
    line.command = parser.suggestCommand;
  } else if (parser.status->parsed()) {
    line.command = parser.statusCommand;
  } else if (parser.watch->parsed()) {
    unmark(parser.watchCommand.words);
    unmark(parser.watchCommand.books);
    line.command = parser.watchCommand;
  } else if (parser.models->parsed()) {
    line.command = parser.modelsCommand;
  } else if (parser.anchor->parsed()) {
    parser.anchorCommand.name = unmarked(parser.anchorCommand.name);
    unmark(parser.anchorCommand.books);
    line.command = parser.anchorCommand;
  } else if (parser.books->parsed()) {
    line.command = parser.booksCommand;
  } else if (parser.index->parsed()) {
    unmark(parser.indexCommand.folders);
    unmark(parser.indexCommand.bookIDs);
    line.command = parser.indexCommand;
  } else if (parser.add->parsed()) {
    parser.addCommand.url = unmarked(parser.addCommand.url);
    unmark(parser.addCommand.books);
    unmark(parser.addCommand.languages);
    line.command = parser.addCommand;
  } else if (parser.remove->parsed()) {
    unmark(parser.removeCommand.names);
    line.command = parser.removeCommand;
  } else if (parser.publish->parsed()) {
    unmark(parser.publishCommand.folders);
    unmark(parser.publishCommand.bookIDs);
    parser.publishCommand.site = unmarked(parser.publishCommand.site);
    parser.publishCommand.language = unmarked(parser.publishCommand.language);
    line.command = parser.publishCommand;
  } else if (parser.doctor->parsed()) {
    unmark(parser.doctorCommand.books);
    line.command = parser.doctorCommand;
  } else {
    unmark(parser.scanCommand.folders);
    unmark(parser.scanCommand.languages);
    parser.scanCommand.root = unmarked(parser.scanCommand.root);
    parser.scanCommand.installedBooks = !parser.noInstalledBooks;
    line.command = parser.scanCommand;
  }
  return line;
}

}  // namespace zeb
