#include "zeb/Doctor.h"

#include <fmt/format.h>

#include <nlohmann/json.hpp>
#include <ostream>
#include <set>
#include <string>
#include <string_view>
#include <utility>

#include "platform/Strings.h"
#include "platform/UserDefaults.h"
#include "zeb/BookExamination.h"
#include "zeb/RemoteBooks.h"
#include "zeb/SystemExamination.h"

#ifndef ZEB_VERSION
#define ZEB_VERSION "0"
#endif

namespace zeb {

namespace {

using JSON = nlohmann::ordered_json;

struct Diagnosis {
  std::vector<Finding> findings;
  DaemonState daemon;
  size_t bookCount = 0;
};

void append(std::vector<Finding>& findings, std::vector<Finding> more) {
  findings.insert(findings.end(), std::make_move_iterator(more.begin()),
                  std::make_move_iterator(more.end()));
}

std::vector<Finding> examineServers(const DoctorCommand& command, const zebd::Catalogue& catalogue,
                                    const Waiting& waiting, Console& console) {
  const std::set<std::string> wanted(command.books.begin(), command.books.end());
  std::set<std::string> urls;
  for (const CatalogueEntry& entry : catalogue.entries()) {
    if (entry.catalogueURL && (wanted.empty() || wanted.contains(entry.bookID))) {
      urls.insert(*entry.catalogueURL);
    }
  }
  std::vector<Finding> findings;
  for (const std::string& url : urls) {
    console.progress("asking " + url);
    if (auto problem = problemOfCatalogue(url, waiting)) {
      findings.push_back({"server", std::nullopt, url, std::move(*problem),
                          "see to the connection, or ask the publisher"});
    }
  }
  return findings;
}

std::string nameOfKind(DaemonState::Kind kind) {
  switch (kind) {
    case DaemonState::Kind::noBus:
      return "no-bus";
    case DaemonState::Kind::notInstalled:
      return "not-installed";
    case DaemonState::Kind::silent:
      return "silent";
    case DaemonState::Kind::running:
      return "running";
    case DaemonState::Kind::unasked:
      break;
  }
  return "unasked";
}

std::string sentenceAbout(const DaemonState& daemon) {
  switch (daemon.kind) {
    case DaemonState::Kind::noBus:
      return "there is no session bus, so no help daemon is asked";
    case DaemonState::Kind::notInstalled:
      return "the session bus knows of no help daemon";
    case DaemonState::Kind::silent:
      return "the help daemon does not answer";
    case DaemonState::Kind::running:
      return daemon.isBusy ? "the help daemon runs, and is at work: some of this may pass"
                           : "the help daemon runs";
    case DaemonState::Kind::unasked:
      break;
  }
  return "the help daemon was not asked";
}

std::string counted(size_t count, std::string_view one, std::string_view several) {
  return fmt::format("{} {}", count, count == 1 ? one : several);
}

void print(const Diagnosis& diagnosis, Console& console) {
  const std::vector<Finding>& findings = diagnosis.findings;
  for (size_t i = 0; i < findings.size(); ++i) {
    const Finding& finding = findings[i];
    std::string subject = finding.bookID.value_or("");
    if (finding.path && !finding.path->empty()) {
      subject += (subject.empty() ? "" : ", ") + *finding.path;
    }
    console.out() << console.styled(Style::book, singleLine(subject))
                  << (subject.empty() ? "" : ": ")
                  << console.styled(Style::error, singleLine(finding.text)) << '\n';
    // Once for several that the same helps.
    if (i + 1 == findings.size() || findings[i + 1].advice != finding.advice) {
      console.out() << "  " << singleLine(finding.advice) << '\n';
    }
  }
  console.out() << (findings.empty()
                        ? "all is well"
                        : counted(findings.size(), "thing is wrong", "things are wrong"))
                << "; " << counted(diagnosis.bookCount, "book", "books") << " looked at; "
                << sentenceAbout(diagnosis.daemon) << '\n';
}

JSON text(std::string_view bytes) { return platform::stringByRepairingUTF8(bytes); }

void printAsJSON(const Diagnosis& diagnosis, Console& console) {
  JSON findings = JSON::array();
  for (const Finding& finding : diagnosis.findings) {
    JSON entry;
    entry["finding"] = finding.name;
    if (finding.bookID) {
      entry["book"] = text(*finding.bookID);
    }
    if (finding.path) {
      entry["path"] = text(*finding.path);
    }
    entry["text"] = text(finding.text);
    entry["advice"] = text(finding.advice);
    findings.push_back(std::move(entry));
  }
  JSON daemon;
  daemon["state"] = nameOfKind(diagnosis.daemon.kind);
  if (diagnosis.daemon.kind == DaemonState::Kind::running) {
    daemon["version"] = text(diagnosis.daemon.version);
    daemon["busy"] = diagnosis.daemon.isBusy;
  }
  JSON object;
  object["count"] = diagnosis.findings.size();
  object["books"] = diagnosis.bookCount;
  object["daemon"] = std::move(daemon);
  object["findings"] = std::move(findings);
  console.out() << object.dump(2, ' ', false, JSON::error_handler_t::replace) << '\n';
}

}  // namespace

std::vector<Finding> findingsOfDaemon(const DaemonState& state, const std::string& ownVersion) {
  if (state.kind == DaemonState::Kind::silent) {
    return {{"daemon", std::nullopt, std::nullopt,
             "the help daemon does not answer: " + state.reason,
             "'journalctl --user --unit zebd.service' may say why; --no-daemon does without it"}};
  }
  if (state.kind == DaemonState::Kind::running && state.version != ownVersion) {
    return {{"other-version", std::nullopt, std::nullopt,
             fmt::format("the help daemon that runs is of version {}, this is {}",
                         state.version.empty() ? "unknown" : state.version, ownVersion),
             "end it ('systemctl --user stop zebd.service'); the next search starts the new one"}};
  }
  return {};
}

ExitCode examine(const DoctorCommand& command, const zebd::Catalogue& catalogue,
                 const zebd::Installation& installation, const Waiting& waiting, bool asksDaemon,
                 Console& console) {
  Diagnosis diagnosis;
  diagnosis.findings = examineSystem(catalogue, installation, platform::userDefaultsPath());
  BookExamination books(catalogue, [&](std::string_view bookID) {
    console.progress("looking at " + std::string(bookID));
  });
  append(diagnosis.findings, books.run(command.books));
  diagnosis.bookCount = books.count();
  if (command.asksServers) {
    append(diagnosis.findings, examineServers(command, catalogue, waiting, console));
  }
  if (asksDaemon) {
    // Last: one that is started now begins to put things right.
    console.progress("asking the help daemon");
    diagnosis.daemon = stateOfDaemon();
    append(diagnosis.findings, findingsOfDaemon(diagnosis.daemon, ZEB_VERSION));
  }
  console.clearProgress();
  if (command.json) {
    printAsJSON(diagnosis, console);
  } else {
    print(diagnosis, console);
  }
  return diagnosis.findings.empty() ? ExitCode::success : ExitCode::nothingFound;
}

}  // namespace zeb
