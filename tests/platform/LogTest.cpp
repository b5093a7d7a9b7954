#include "platform/Log.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>

namespace platform {
namespace {

TEST(CapturingLogSink, keepsLevelsAndMessagesInOrder) {
  CapturingLogSink sink;
  sink.write(3, "first");
  sink.write(1, "second");
  sink.write(3, "third");
  EXPECT_EQ(sink.entries(),
            (std::vector<CapturingLogSink::Entry>{{3, "first"}, {1, "second"}, {3, "third"}}));
  EXPECT_EQ(sink.messages(3), (std::vector<std::string>{"first", "third"}));
  sink.clear();
  EXPECT_TRUE(sink.entries().empty());
}

TEST(StandardErrorLogSink, acceptsLevelsUpToItsMaximum) {
  const auto sink = standardErrorLogSink(2);
  EXPECT_TRUE(sink->accepts(0));
  EXPECT_TRUE(sink->accepts(2));
  EXPECT_FALSE(sink->accepts(3));
}

TEST(StandardErrorLogSink, writesOneLineAMessageWithItsLevel) {
  testing::internal::CaptureStderr();
  const auto sink = standardErrorLogSink(2);
  sink->write(2, "Clearing index cache...");
  sink->write(3, "not wanted");
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "[2] Clearing index cache...\n");
}

TEST(StandardErrorLogSink, marksPrioritiesWhereTheJournalListens) {
  testing::internal::CaptureStderr();
  struct stat status {};
  ASSERT_EQ(::fstat(STDERR_FILENO, &status), 0);
  const std::string stream = std::to_string(status.st_dev) + ":" + std::to_string(status.st_ino);
  ::setenv("JOURNAL_STREAM", stream.c_str(), 1);
  const auto sink = standardErrorLogSink(6);
  ::unsetenv("JOURNAL_STREAM");
  sink->write(0, "a");
  sink->write(1, "b");
  sink->write(2, "c");
  sink->write(3, "d");
  sink->write(5, "e");
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "<3>a\n<3>b\n<5>c\n<6>d\n<7>e\n");
}

}  // namespace
}  // namespace platform
