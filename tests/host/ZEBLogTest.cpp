#include "host/Zebrine/ZEBLog.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Environment.h"
#include "platform/Error.h"
#include "platform/Exception.h"

namespace {

using platform::Value;

struct Describable {
  std::string description() const { return "an object"; }
};

/// Counts how often anyone asks for its description.
struct Counting {
  int* count;
  std::string description() const {
    ++*count;
    return "counted";
  }
};

class ChosenLevelSink : public platform::CapturingLogSink {
 public:
  bool accepts(int level) const noexcept override { return level <= 3; }
};

class ZEBLogTest : public testing::Test {
 protected:
  explicit ZEBLogTest(std::shared_ptr<platform::CapturingLogSink> sink =
                          std::make_shared<platform::CapturingLogSink>())
      : _sink(std::move(sink)), _override(environmentWith(_sink)) {}

  static platform::Environment environmentWith(std::shared_ptr<platform::LogSink> sink) {
    platform::Environment environment = platform::Environment::system();
    environment.log = std::move(sink);
    return environment;
  }

  std::vector<platform::CapturingLogSink::Entry> entries() const { return _sink->entries(); }

  std::shared_ptr<platform::CapturingLogSink> _sink;
  platform::EnvironmentOverride _override;
};

class ZEBLogLevelTest : public ZEBLogTest {
 protected:
  ZEBLogLevelTest() : ZEBLogTest(std::make_shared<ChosenLevelSink>()) {}
};

TEST_F(ZEBLogTest, writesTheMessageWithItsLevelToTheEnvironmentsSink) {
  ZEBLog(2, "Clearing index cache...");
  ZEBLog(5, "%@ and %d", "text", 7);
  EXPECT_EQ(entries(), (std::vector<platform::CapturingLogSink::Entry>{
                           {2, "Clearing index cache..."}, {5, "text and 7"}}));
}

TEST_F(ZEBLogTest, bothPlaceholdersTakeIntegersOfEveryWidth) {
  EXPECT_EQ(ZEBStringWithFormat("%d %d %d %@", INT64_MIN, UINT64_MAX, int8_t{-1}, 12U),
            "-9223372036854775808 18446744073709551615 -1 12");
  EXPECT_EQ(ZEBStringWithFormat("%d %d %@", true, false, 0.5), "1 0 0.5");
}

TEST_F(ZEBLogTest, absentObjectsPrintAsNull) {
  const char* noText = nullptr;
  EXPECT_EQ(
      ZEBStringWithFormat("%@ %@ %@ %@ %@ %@", std::optional<std::string>(),
                          std::shared_ptr<ZEBResult>(), Value(), nullptr, std::nullopt, noText),
      "(null) (null) (null) (null) (null) (null)");
}

TEST_F(ZEBLogTest, absentAndEmptyAreToldApart) {
  EXPECT_EQ(ZEBStringWithFormat("<%@> <%@>", std::optional<std::string>(""), std::string()),
            "<> <>");
}

TEST_F(ZEBLogTest, missingArgumentsStayEmpty) {
  EXPECT_EQ(ZEBStringWithFormat("Error loading %@ (exception: %@)", "reason"),
            "Error loading reason (exception: )");
  EXPECT_EQ(ZEBStringWithFormat("Error creating directory at path <%@>: %@"),
            "Error creating directory at path <>: ");
  EXPECT_EQ(ZEBStringWithFormat("%d%d", 1), "1");
}

TEST_F(ZEBLogTest, argumentsWithoutAPlaceholderAreLeftOut) {
  EXPECT_EQ(ZEBStringWithFormat("only %@", 1, 2, "three"), "only 1");
}

TEST_F(ZEBLogTest, doublePercentIsOneAndOtherPercentsStay) {
  EXPECT_EQ(ZEBStringWithFormat("100%% %%@ %x %@ 5 % %", "done"), "100% %@ %x done 5 % %");
}

TEST_F(ZEBLogTest, placeholdersInsideArgumentsAreText) {
  EXPECT_EQ(ZEBStringWithFormat("%@ %@", "%@%d%%", "b"), "%@%d%% b");
}

TEST_F(ZEBLogTest, valuesPrintTheirDescription) {
  EXPECT_EQ(ZEBStringWithFormat("%@ %@ %@", Value("plain"), Value(Value::Array{"a", 1}),
                                Value::Dictionary{{"key", true}}),
            R"(plain ["a", 1] {"key": true})");
}

TEST_F(ZEBLogTest, numbersInsideValuesFitBothPlaceholders) {
  EXPECT_EQ(ZEBStringWithFormat("%d %@ %@", Value(-4), Value(0.5), Value(true)), "-4 0.5 true");
}

TEST_F(ZEBLogTest, listsAndDictionariesPrintTheirElements) {
  EXPECT_EQ(ZEBStringWithFormat("%@", std::vector<std::string>{"a", "b\""}), R"(["a", "b\""])");
  EXPECT_EQ(ZEBStringWithFormat("%@", std::vector<int>{}), "[]");
  EXPECT_EQ(ZEBStringWithFormat("%@", std::vector<std::optional<std::string>>{"a", std::nullopt}),
            R"(["a", (null)])");
  EXPECT_EQ(ZEBStringWithFormat("%@", std::vector<std::vector<int>>{{1, 2}, {3}}), "[[1, 2], [3]]");
  EXPECT_EQ(ZEBStringWithFormat("%@", std::map<std::string, int>{{"b", 2}, {"a", 1}}),
            R"({"a": 1, "b": 2})");
  EXPECT_EQ(ZEBStringWithFormat(
                "%@", std::vector<std::shared_ptr<Describable>>{std::make_shared<Describable>(),
                                                                nullptr}),
            "[an object, (null)]");
}

TEST_F(ZEBLogTest, longListsAreCut) {
  const std::string message = ZEBStringWithFormat("%@", std::vector<int>(1000000, 1));
  EXPECT_LE(message.size(), ZEBDescriptionMaximumLength + 3);
  EXPECT_TRUE(message.ends_with("…"));
}

TEST_F(ZEBLogTest, objectsDescribeThemselves) {
  EXPECT_EQ(ZEBStringWithFormat("%@ %@", Describable(), std::make_shared<const Describable>()),
            "an object an object");
  const auto result = ZEBResult::resultWithTitle("Printing", ZEBHelpArticleResult);
  EXPECT_EQ(ZEBStringWithFormat("%@", result),
            R"(ZEBHelpArticleResult "Printing" relevance: (null) payload: {})");
}

TEST_F(ZEBLogTest, urlsPrintTheirAbsoluteString) {
  const auto base = platform::URL::URLWithString("https://example.org/book/");
  const auto url = platform::URL::URLWithStringRelativeToURL("a.html", *base);
  EXPECT_EQ(ZEBStringWithFormat("%@", url), "https://example.org/book/a.html");
}

TEST_F(ZEBLogTest, exceptionsPrintTheirReason) {
  EXPECT_EQ(ZEBStringWithFormat("%@", platform::Exception("RangeException", "index 3 beyond 2")),
            "index 3 beyond 2");
  EXPECT_EQ(ZEBStringWithFormat("%@", std::runtime_error("went wrong")), "went wrong");
}

TEST_F(ZEBLogTest, errorsPrintDescriptionDomainAndCode) {
  EXPECT_EQ(ZEBStringWithFormat("%@", std::optional(platform::Error{"Domain", -1008, "no file"})),
            "no file (Domain -1008)");
}

TEST_F(ZEBLogTest, lineBreaksInAFormatReachTheSink) {
  ZEBLog(1, "Problems for %@:\nurl: %@", "file", std::nullopt);
  EXPECT_EQ(_sink->messages(1), std::vector<std::string>{"Problems for file:\nurl: (null)"});
}

TEST_F(ZEBLogLevelTest, levelsThatTheSinkDoesNotWantAreNeitherFormattedNorWritten) {
  int count = 0;
  ZEBLog(4, "%@", Counting{&count});
  EXPECT_EQ(count, 0);
  EXPECT_TRUE(entries().empty());
  ZEBLog(3, "%@", Counting{&count});
  EXPECT_EQ(count, 1);
  EXPECT_EQ(_sink->messages(3), std::vector<std::string>{"counted"});
}

TEST(ZEBLogWithoutSink, isSilent) {
  platform::Environment environment = platform::Environment::system();
  environment.log = nullptr;
  const platform::EnvironmentOverride override(std::move(environment));
  EXPECT_FALSE(ZEBLogAccepts(0));
  ZEBLog(0, "%@", "nobody listens");
  ZEBLogMessage(0, "nobody listens");
}

}  // namespace
