// Search by meaning from the command line, over the shipped books.
#include <gmock/gmock.h>

#include <filesystem>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "platform/Files.h"
#include "tests/zeb/World.h"

namespace {

using testing::Contains;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using tests::Outcome;
using zeb::ExitCode;
using JSON = nlohmann::json;

class MeaningTest : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    world = new tests::World;
    const Outcome run = world->zeb(
        {"scan", "--no-system", tests::shippedBook("manual"), tests::shippedBook("offline")});
    ASSERT_EQ(run.code, ExitCode::success) << run.err;
  }
  static void TearDownTestSuite() {
    delete world;
    world = nullptr;
  }
  static std::vector<std::string> suggestions(std::vector<std::string> arguments) {
    arguments.emplace_back("--json");
    const JSON json = JSON::parse(world->zeb(arguments).out);
    std::vector<std::string> texts;
    for (const JSON& suggestion : json["suggestions"]) {
      texts.push_back(suggestion["text"]);
    }
    EXPECT_EQ(json["count"], texts.size());
    return texts;
  }

  static tests::World* world;
};

tests::World* MeaningTest::world = nullptr;

TEST_F(MeaningTest, ScanLeavesAModelOfTheBooks) {
  const JSON json = JSON::parse(world->zeb({"models", "--json"}).out);
  ASSERT_EQ(json["count"], 1);
  const JSON model = json["models"][0];
  EXPECT_EQ(model["group"], "Default");
  EXPECT_EQ(model["language"], "English");
  EXPECT_EQ(model["books"], JSON::parse(R"(["org.zeb.manual", "org.zeb.offline"])"));
  EXPECT_GE(model["pages"], 18);
  EXPECT_GT(model["bytes"], 1000);
  EXPECT_EQ(model["needsBuild"], false);
  const Outcome run = world->zeb({"models"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_THAT(run.out, HasSubstr("Default  English  2 books"));
}

TEST_F(MeaningTest, PagesAreFoundByQuestionsInTheUsersWords) {
  for (const auto& [question, page] :
       {std::pair("is my query sent anywhere", "files-and-privacy.html"),
        std::pair("add my own pages", "books.html"),
        std::pair("no internet", "not-connected.html")}) {
    const JSON json = JSON::parse(world->zeb({"search", question, "--json"}).out);
    ASSERT_FALSE(json["results"].empty()) << question;
    EXPECT_THAT(json["results"][0]["url"].get<std::string>(), HasSubstr(page)) << question;
  }
}

TEST_F(MeaningTest, ExactTitleComesFirstWithRelevanceOne) {
  const JSON json = JSON::parse(
      world->zeb({"search", "Open a topic by its anchor", "--book", "org.zeb.manual", "--json"})
          .out);
  ASSERT_FALSE(json["results"].empty());
  EXPECT_THAT(json["results"][0]["url"].get<std::string>(), HasSubstr("anchors.html"));
  EXPECT_DOUBLE_EQ(json["results"][0]["relevance"], 1.0);
}

TEST_F(MeaningTest, HalfAWordIsCompletedFromTheBooks) {
  const auto found = suggestions({"suggest", "anch"});
  EXPECT_THAT(found, Contains(HasSubstr("anchor")));
  EXPECT_THAT(suggestions({"suggest", "anch", "--limit", "1"}), SizeIs(1));
  EXPECT_THAT(suggestions({"suggest", "zzzzqq"}), IsEmpty());
  EXPECT_EQ(world->zeb({"suggest", "zzzzqq"}).code, ExitCode::nothingFound);
}

TEST_F(MeaningTest, SimilarSearchesAreOtherWordsThanTheQuery) {
  const auto found = suggestions({"similar", "exact match list"});
  EXPECT_THAT(found, Not(IsEmpty()));
  EXPECT_THAT(found, Not(Contains("exact match list")));
}

TEST_F(MeaningTest, ActionsArePagesFoundByMeaningAlone) {
  const Outcome run = world->zeb({"search", "--actions", "index a folder", "--json"});
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  EXPECT_FALSE(JSON::parse(run.out)["results"].empty());
}

TEST_F(MeaningTest, ModelsThatAreBeingBuiltAreListedAsSuch) {
  const std::string models = world->cacheFolder() + "/org.zeb.zebd/Models/Default/";
  EXPECT_EQ(JSON::parse(world->zeb({"models", "--json"}).out)["models"][0]["activity"], "none");
  EXPECT_THAT(world->zeb({"models"}).out, Not(HasSubstr("being built")));
  {
    // As builds mark their models: one that was there, and one that is new.
    std::filesystem::create_directories(models + "German");
    const platform::FileManager files;
    const auto old = files.markFolder(models + "English");
    const auto fresh = files.markFolder(models + "German");
    const JSON json = JSON::parse(world->zeb({"models", "--json"}).out);
    ASSERT_EQ(json["count"], 2);
    EXPECT_EQ(json["models"][0]["activity"], "building");
    EXPECT_EQ(json["models"][0]["needsBuild"], false);
    EXPECT_EQ(json["models"][1]["language"], "German");
    EXPECT_EQ(json["models"][1]["activity"], "building");
    EXPECT_EQ(json["models"][1]["needsBuild"], true);
    EXPECT_THAT(world->zeb({"models"}).out, HasSubstr("  being built\n"));
  }
  std::filesystem::remove(models + "German");
  EXPECT_EQ(JSON::parse(world->zeb({"models", "--json"}).out)["models"][0]["activity"], "none");
}

TEST_F(MeaningTest, WithoutBooksThereAreNoModels) {
  const tests::World empty;
  EXPECT_EQ(empty.zeb({"models"}).code, ExitCode::nothingFound);
  EXPECT_EQ(empty.zeb({"suggest", "a"}).code, ExitCode::failure);
  EXPECT_EQ(empty.zeb({"similar", "a"}).code, ExitCode::failure);
}

TEST_F(MeaningTest, DeletedModelIsBuiltAgainWhileKeywordsAnswer) {
  const std::filesystem::path models = world->cacheFolder() + "/org.zeb.zebd/Models";
  ASSERT_TRUE(std::filesystem::exists(models));
  std::filesystem::remove_all(models);
  EXPECT_EQ(world->zeb({"search", "anchor"}).code, ExitCode::success);
  EXPECT_EQ(world->zeb({"models"}).code, ExitCode::success);
}

}  // namespace
