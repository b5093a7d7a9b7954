#include "bvmake/Report.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>

#include "platform/Clock.h"
#include "platform/Environment.h"

namespace bvmake {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

/// A report into memory, on a clock that stands still.
class StreamReportBar : public testing::Test {
 protected:
  StreamReportBar() : _stream(open_memstream(&_text, &_length)) {
    platform::Environment environment = platform::Environment::system();
    environment.clock = _clock;
    _override = std::make_unique<platform::EnvironmentOverride>(environment);
  }
  ~StreamReportBar() override {
    std::fclose(_stream);
    std::free(_text);
  }

  std::string written() {
    std::fflush(_stream);
    return {_text, _length};
  }

  /// What a terminal shows, line by line.
  std::vector<std::string> shown() {
    std::vector<std::string> lines(1);
    size_t column = 0;
    for (const char character : written()) {
      if (character == '\n') {
        lines.emplace_back();
        column = 0;
      } else if (character == '\r') {
        column = 0;
      } else {
        lines.back().resize(std::max(lines.back().size(), column + 1), ' ');
        lines.back()[column++] = character;
      }
    }
    for (std::string& line : lines) {
      line.erase(line.find_last_not_of(' ') + 1);
    }
    return lines;
  }

  char* _text = nullptr;
  size_t _length = 0;
  std::FILE* _stream;
  std::shared_ptr<platform::SimulatedClock> _clock = std::make_shared<platform::SimulatedClock>();
  std::unique_ptr<platform::EnvironmentOverride> _override;
};

TEST_F(StreamReportBar, tellsHowFarTheRunIs) {
  StreamReport report(_stream, "tool", 0);
  report.showProgressBar();
  report.filesDone(10, 40);
  EXPECT_THAT(shown(), testing::ElementsAre("tool: [##########..............................] "
                                            "10 of 40 files"));
  report.filesDone(40, 40);
  EXPECT_THAT(shown(), testing::ElementsAre("tool: [########################################] "
                                            "40 of 40 files"));
}

TEST_F(StreamReportBar, isDrawnTenTimesASecondAtMostAndAtTheEnd) {
  StreamReport report(_stream, "tool", 0);
  report.showProgressBar();
  for (size_t i = 1; i <= 1000; ++i) {
    report.filesDone(i, 1001);
  }
  EXPECT_THAT(written(), Not(HasSubstr("\r")));
  _clock->advance(platform::Seconds(0.2));
  report.filesDone(500, 1001);
  EXPECT_THAT(written(), EndsWith("500 of 1001 files"));
  report.filesDone(1001, 1001);
  EXPECT_THAT(written(), EndsWith("1001 of 1001 files"));
}

TEST_F(StreamReportBar, makesWayForMessages) {
  StreamReport report(_stream, "tool", 1);
  report.showProgressBar();
  report.filesDone(1, 4);
  report.warning("odd");
  EXPECT_THAT(shown(), testing::ElementsAre("tool: warning: odd", ""));
  _clock->advance(platform::Seconds(1));
  report.filesDone(2, 4);
  EXPECT_THAT(shown()[1], HasSubstr("2 of 4 files"));
}

TEST_F(StreamReportBar, leavesNothingInTheEnd) {
  {
    StreamReport report(_stream, "tool", 0);
    report.showProgressBar();
    report.filesDone(4, 4);
  }
  EXPECT_THAT(shown(), testing::ElementsAre(""));
}

TEST_F(StreamReportBar, isNotThereUnlessAskedForNorBesideALinePerPage) {
  StreamReport plain(_stream, "tool", 0);
  plain.filesDone(4, 4);
  StreamReport verbose(_stream, "tool", 2);
  verbose.showProgressBar();
  verbose.filesDone(4, 4);
  StreamReport empty(_stream, "tool", 0);
  empty.showProgressBar();
  empty.filesDone(0, 0);
  EXPECT_EQ(written(), "");
}

}  // namespace
}  // namespace bvmake
