#include <gtest/gtest.h>

#include "plugin/keyword/ZEBHelpindexSearchController.h"

namespace {

std::string prepared(std::string_view query, const std::vector<std::string>& terms) {
  return ZEBHelpindexSearchController::init()->_prepareQuery(query, terms);
}

}  // namespace

TEST(QueryComposition, EveryTermBecomesAPrefixInTheOrderOfTheTerms) {
  EXPECT_EQ(prepared("print queue", {"print", "queue"}), "print* queue* ");
  EXPECT_EQ(prepared("print queue", {"queue", "print"}), "queue* print* ");
  EXPECT_EQ(prepared("Print, QUEUE?", {"print", "queue"}), "print* queue* ");
  EXPECT_EQ(prepared("a", {"a"}), "a* ");
}

TEST(QueryComposition, AnyOperatorAnywherePassesTheQueryOnAsTyped) {
  for (const char c : std::string_view("-+*()&|!\"")) {
    for (const std::string& query :
         {std::string(1, c), c + std::string("print queue"), std::string("print queue") + c,
          std::string("pri") + c + "nt  queue "}) {
      EXPECT_EQ(prepared(query, {"print", "queue"}), query);
      EXPECT_EQ(prepared(query, {}), query);
    }
  }
}

TEST(QueryComposition, NoOtherCharacterIsAnOperator) {
  for (int c = 0; c < 256; ++c) {
    const char character = static_cast<char>(c);
    if (std::string_view("-+*()&|!\"").find(character) == std::string_view::npos) {
      EXPECT_EQ(prepared(std::string("a") + character + "b", {"term"}), "term* ") << c;
    }
  }
}

TEST(QueryComposition, OperatorsAreLookedForInTheQueryNotInTheTerms) {
  EXPECT_EQ(prepared("print", {"pr-int", "(x)"}), "pr-int* (x)* ");
}

TEST(QueryComposition, WithoutTermsTheQueryIsEmpty) {
  EXPECT_EQ(prepared("?!", {}), "?!");
  EXPECT_EQ(prepared("?.,", {}), "");
  EXPECT_EQ(prepared("", {}), "");
}

TEST(QueryComposition, ChangingTheComposedQueryDoesNotChangeTheOriginal) {
  const auto controller = ZEBHelpindexSearchController::init();
  const std::string query = "\"print queue\"";
  std::string composed = controller->_prepareQuery(query, {"print"});
  composed += "!";
  EXPECT_EQ(query, "\"print queue\"");
  EXPECT_EQ(controller->_prepareQuery(query, {"print"}), query);
}

TEST(QueryComposition, SecondQueryIsComposedLikeTheFirst) {
  const auto controller = ZEBHelpindexSearchController::init();
  EXPECT_EQ(controller->_prepareQuery("print", {"print"}), "print* ");
  EXPECT_EQ(controller->_prepareQuery("-print", {"print"}), "-print");
  EXPECT_EQ(controller->_prepareQuery("queue", {"queue"}), "queue* ");
}
