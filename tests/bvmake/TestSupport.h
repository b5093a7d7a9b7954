// What the tests of the indexing tool share: folders that vanish, reports that can be read back.
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "bvmake/Page.h"
#include "bvmake/Report.h"

namespace bvmake {

/// A folder of its own for one test; gone, with all that is in it, when the object is.
class TemporaryFolder {
 public:
  TemporaryFolder();
  ~TemporaryFolder();
  TemporaryFolder(const TemporaryFolder&) = delete;
  TemporaryFolder& operator=(const TemporaryFolder&) = delete;

  const std::string& path() const noexcept { return _path; }

  /// The absolute form of a path within the folder.
  std::string operator/(std::string_view relative) const {
    return _path + "/" + std::string(relative);
  }

  /// Writes a file, and the folders above it, and returns its absolute path.
  std::string write(std::string_view relative, std::string_view contents) const;

  void makeFolder(std::string_view relative) const;
  void makeLink(std::string_view target, std::string_view relative) const;

 private:
  std::string _path;
};

std::string contentsOfFile(const std::string& path);

class RecordingReport : public Report {
 public:
  explicit RecordingReport(int verbosity = 3) : _verbosity(verbosity) {}

  void error(std::string_view text) override { errors.emplace_back(text); }
  void warning(std::string_view text) override { warnings.emplace_back(text); }
  void progress(int verbosity, std::string_view text) override {
    if (wants(verbosity)) {
      messages.emplace_back(verbosity, text);
    }
  }
  bool wants(int verbosity) const noexcept override { return verbosity <= _verbosity; }

  std::vector<std::string> errors;
  std::vector<std::string> warnings;
  std::vector<std::pair<int, std::string>> messages;

 private:
  int _verbosity;
};

/// The texts of a page's body, kinds left aside.
std::vector<std::string> bodyTexts(const Page& page);

/// What a child process did.
struct ChildResult {
  /// Exit status; -1 when a signal ended it.
  int status = -1;
  std::string output;
  std::string errors;
};

/// Runs the real program with these arguments and waits for it.
ChildResult runBvmake(const std::vector<std::string>& arguments);

}  // namespace bvmake
