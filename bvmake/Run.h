// The tool's work as a function: a folder of help pages becomes a help-index file.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace bvmake {

class Report;

/// What the program's exit status says.
enum class ExitCode : int {
  success = 0,
  /// The folder, the output file or the file to look at cannot be used.
  failure = 1,
  /// The command line is wrong; nothing was done.
  usage = 2,
  /// The file that was checked is damaged.
  damaged = 3,
};

inline constexpr size_t maximumJobs = 256;

/// One run of `bvmake --create`.
struct CreateOptions {
  /// The folder to index; page paths in the index are relative to it, with a leading slash.
  std::string folder;
  /// The help-index file to write. Missing folders above it are created.
  std::string outputPath;
  /// Store which pages carry which anchors.
  bool anchors = false;
  /// Give pages without a description their first sentences as abstract.
  bool generateSummaries = false;
  /// Terms of fewer characters are left out of the keyword index.
  size_t minimumTermLength = 1;
  /// Add semantic data to the file that is there, in place of what it has of them, and leave
  /// everything else in it as it is.
  bool appendLUXOnly = false;
  /// The tag or name of the language that the pages are in; when empty it is found out
  /// (SemanticData.h).
  std::string language;
  /// How many threads read pages; 0 for as many as there are processors, or one with
  /// loweredPriority. Never more than maximumJobs.
  size_t jobs = 0;
  /// Give way to all other programs, on the processor and on the disk. Holds for the whole process
  /// from then on.
  bool loweredPriority = false;
};

/// What one run did.
struct Outcome {
  ExitCode exitCode = ExitCode::success;
  /// Pages in the keyword index; with appendLUXOnly in the semantic data.
  size_t pageCount = 0;
  /// Pages that could not be read and were reported.
  size_t skippedCount = 0;
  /// Pages left out because they ask for it or hold nothing.
  size_t leftOutCount = 0;
  /// Pages in the index that have an abstract.
  size_t abstractCount = 0;
  /// Names in the anchor table.
  size_t anchorCount = 0;
  /// Bytes of all pages read.
  uint64_t inputBytes = 0;
  /// Bytes of the semantic data.
  uint64_t semanticBytes = 0;
  /// Bytes of the file written.
  uint64_t outputBytes = 0;
};

/// Indexes a folder. The same bytes are written for the same folder contents and options, whatever
/// order the disk lists the files in and however many threads read them; messages come in the order
/// of the files' paths. A page or sub-folder that cannot be read is reported as a
/// warning and left out; what makes the run fail is reported as an error, and then the file at the
/// output path is as it was before. Throws nothing but std::bad_alloc.
/// Files are read and written through platform::Environment::current()->files.
/// Thread-safety: runs in different threads do not touch each other.
Outcome run(const CreateOptions& options, Report& report);

}  // namespace bvmake
