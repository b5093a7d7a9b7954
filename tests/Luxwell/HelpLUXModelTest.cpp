#include "host/Luxwell/HelpLUXModel.h"

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <thread>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelSections.h"
#include "host/Luxwell/LUXModelView.h"
#include "platform/Processes.h"
#include "tests/Luxwell/LUXModelUse.h"
#include "tests/Luxwell/LUXModelWorld.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/platform/TestEnvironment.h"

using platform::Value;

namespace {

using Names = std::vector<std::string>;

class HelpLUXModelFile : public testing::Test {
 protected:
  std::string directory() const { return folder.path("a/model"); }
  std::string file() const { return directory() + "/LUXModel"; }

  std::shared_ptr<HelpLUXModel> open(const std::string& language = "English") const {
    return HelpLUXModel::initWithDirectoryPath(directory(), language);
  }

  void save(HelpLUXModel& model, const std::string& book = "org.zeb.first") const {
    model.reset();
    model.addHelpbookID(book);
    tests::addPages(model, {{book, "a.html", "Print queue", "The print queue."},
                            {book, "b.html", "Networks", "A print queue in a network."}});
    ASSERT_TRUE(model.saveWithOptions({}));
  }

  std::string bytes() const {
    std::ifstream in(file(), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
  }

  // Writes into the file that is there, as no part of this system does.
  void overwrite(const std::string& bytes) const {
    std::ofstream(file(), std::ios::binary | std::ios::trunc) << bytes;
  }

  Names namesInDirectory() const {
    return platform::systemFileManager()->namesInDirectory(directory()).value_or(Names());
  }

  tests::TemporaryFolder folder;
};

}  // namespace

TEST_F(HelpLUXModelFile, AFolderThatIsNotThereYetWillDo) {
  const auto model = open();
  ASSERT_NE(model, nullptr);
  EXPECT_EQ(model->modelDirectoryPath(), directory());
  EXPECT_EQ(model->language(), "English");
  EXPECT_EQ(model->activity(), kLUXModelActivityNone);
  EXPECT_TRUE(model->needsBuild());
  EXPECT_EQ(model->view(), nullptr);
  EXPECT_EQ(model->suggestions(), nullptr);
  EXPECT_EQ(model->allHelpbookIDs(), Names{});
  model->loadLSMMap();
  model->currentThreadIsAboutToComplete();
  EXPECT_FALSE(std::filesystem::exists(directory()));
}

TEST_F(HelpLUXModelFile, AFileInThePlaceOfTheFolderWillNotDo) {
  EXPECT_EQ(HelpLUXModel::initWithDirectoryPath(folder.write("file", "x"), "English"), nullptr);
  EXPECT_EQ(HelpLUXModel::initWithDirectoryPath("", "English"), nullptr);
  EXPECT_EQ(HelpLUXModel::initWithDirectoryPath(std::string("/a\0b", 4), "English"), nullptr);
}

TEST_F(HelpLUXModelFile, TheActivityIsWhatWasSet) {
  const auto model = open();
  model->setActivity(kLUXModelActivityBuilding);
  EXPECT_EQ(model->activity(), 2);
  model->setActivity(kLUXModelActivityPreloading);
  EXPECT_EQ(model->activity(), 3);
}

TEST_F(HelpLUXModelFile, ASavedModelIsReadByThisAndByOtherObjects) {
  const auto model = open();
  save(*model);
  for (const auto& reader : {model, open()}) {
    EXPECT_FALSE(reader->needsBuild());
    EXPECT_EQ(reader->allHelpbookIDs(), Names{"org.zeb.first"});
    ASSERT_NE(reader->view(), nullptr);
    EXPECT_EQ(reader->view()->pageCount(), 2U);
    EXPECT_EQ(reader->suggestions(), reader->view());
    reader->loadLSMMap();
    EXPECT_FALSE(reader->needsBuild());
  }
}

TEST_F(HelpLUXModelFile, BooksAreListedInTheOrderInWhichTheyWereAddedEachOnce) {
  const auto model = open();
  model->reset();
  const Names books{"z*2.0", "a", "m"};
  for (const std::string& book : books) {
    model->addHelpbookID(book);
  }
  model->addHelpbookID("a");
  EXPECT_EQ(model->allHelpbookIDs(), books);
  ASSERT_TRUE(model->saveWithOptions({}));
  EXPECT_EQ(model->allHelpbookIDs(), books);
  EXPECT_EQ(open()->allHelpbookIDs(), books);
}

TEST_F(HelpLUXModelFile, AfterAResetTheOldModelStaysUntilTheNextSave) {
  const auto model = open();
  save(*model, "old");
  const std::string before = bytes();
  model->reset();
  EXPECT_EQ(bytes(), before);
  EXPECT_FALSE(model->needsBuild());
  ASSERT_NE(model->view(), nullptr);
  EXPECT_EQ(model->view()->bookID(0), "old");
  EXPECT_EQ(model->allHelpbookIDs(), Names{}) << "those of the collection";
  ASSERT_TRUE(model->saveWithOptions({}));
  EXPECT_EQ(model->view()->bookCount(), 0U);
  EXPECT_FALSE(model->needsBuild());
}

TEST_F(HelpLUXModelFile, AResetMakesTheFolderAndForgetsWhatWasCollected) {
  const auto model = open();
  model->addHelpbookID("forgotten");
  model->reset();
  EXPECT_TRUE(std::filesystem::is_directory(directory()));
  EXPECT_EQ(namesInDirectory(), Names{});
  EXPECT_EQ(model->allHelpbookIDs(), Names{});
}

TEST_F(HelpLUXModelFile, ACollectionMayBeginWithoutAReset) {
  const auto model = open();
  tests::addPages(*model, {{"book", "page", "Title", "Text"}});
  EXPECT_EQ(model->allHelpbookIDs(), Names{"book"});
  EXPECT_TRUE(model->saveWithOptions({}));
  EXPECT_EQ(model->view()->pageCount(), 1U);
}

TEST_F(HelpLUXModelFile, WithoutACollectionNothingIsSaved) {
  const auto model = open();
  EXPECT_FALSE(model->saveWithOptions({}));
  EXPECT_FALSE(std::filesystem::exists(file()));
  save(*model);
  const std::string before = bytes();
  EXPECT_FALSE(model->saveWithOptions({}));
  EXPECT_EQ(bytes(), before);
}

TEST_F(HelpLUXModelFile, PagesWithoutAFileLendTheirWordsAndAreNotFound) {
  const auto model = open();
  model->reset();
  tests::addPages(*model, {{"book", "page", "", "paper"}, {"smoothing", "", "", "paper"}});
  ASSERT_TRUE(model->saveWithOptions({}));
  const auto view = model->view();
  EXPECT_EQ(model->allHelpbookIDs(), Names{"book"});
  EXPECT_EQ(view->pageCount(), 1U);
  EXPECT_EQ(view->totalPageCount(), 2U);
  const auto stem = view->termNumber(LUXTokenKind::stem, "paper");
  ASSERT_TRUE(stem);
  EXPECT_EQ(view->documentFrequency(LUXTokenKind::stem, *stem), 2U);
  EXPECT_EQ(view->postings(LUXTokenKind::stem, *stem).size(), 1U);
}

TEST_F(HelpLUXModelFile, OptionsAreKeptInTheModel) {
  const auto model = open();
  const Value options =
      Value::Dictionary{{"SuggestionThresholdsPerBook",
                         Value::Dictionary{{"book", Value::Dictionary{{"BigramThreshold", 1.5}}}}}};
  model->reset();
  ASSERT_TRUE(model->saveWithOptions(options));
  EXPECT_EQ(model->view()->options(), options);
}

TEST_F(HelpLUXModelFile, AModelOfAnotherLanguageNeedsToBeBuilt) {
  save(*open("German"));
  EXPECT_FALSE(open("German")->needsBuild());
  EXPECT_TRUE(open("French")->needsBuild());
}

TEST_F(HelpLUXModelFile, AModelOfAnotherTokenizerNeedsToBeBuilt) {
  const auto model = open();
  save(*model);
  auto sections = LUXSectionedData::read(platform::Data::copy(bytes()), LUXModelForm)->sections();
  std::string numbers(sections[0].bytes.view());
  ++numbers[0];
  sections[0] =
      LUXSection::sectionWithBytes(luxmodel::numbersSection, platform::Data::copy(numbers));
  overwrite(std::string(LUXSectionedData(sections, LUXModelForm).write().view()));
  ASSERT_NE(model->view(), nullptr);
  EXPECT_NE(model->view()->tokenizerVersion(), HelpTokenizer::version());
  EXPECT_TRUE(model->needsBuild());
}

TEST_F(HelpLUXModelFile, AModelOfAnotherVersionNeedsToBeBuilt) {
  const auto model = open();
  save(*model);
  const auto sections = LUXSectionedData::read(platform::Data::copy(bytes()), LUXModelForm);
  const LUXContainerForm later{LUXModelForm.magic, uint16_t(LUXModelForm.majorVersion + 1), 0};
  overwrite(std::string(LUXSectionedData(sections->sections(), later).write().view()));
  EXPECT_TRUE(model->needsBuild());
  EXPECT_EQ(model->view(), nullptr);
  EXPECT_EQ(model->allHelpbookIDs(), Names{});
}

TEST_F(HelpLUXModelFile, AViewStaysAsItIsWhileTheModelIsReplaced) {
  const auto model = open();
  save(*model, "old");
  const auto old = model->view();
  save(*model, "new");
  EXPECT_EQ(old->bookID(0), "old");
  EXPECT_TRUE(old->checksumsMatch());
  EXPECT_EQ(model->view()->bookID(0), "new");
}

TEST_F(HelpLUXModelFile, WhatAnotherObjectSavedIsSeen) {
  const auto reader = open();
  save(*open(), "old");
  EXPECT_EQ(reader->allHelpbookIDs(), Names{"old"});
  save(*open(), "new");
  EXPECT_EQ(reader->allHelpbookIDs(), Names{"new"});
}

TEST_F(HelpLUXModelFile, AModelThatIsDeletedWhileItIsOpenNeedsToBeBuilt) {
  const auto model = open();
  save(*model);
  const auto held = model->view();
  std::filesystem::remove_all(directory());
  EXPECT_TRUE(model->needsBuild());
  EXPECT_EQ(model->view(), nullptr);
  EXPECT_TRUE(held->checksumsMatch()) << "what is held stays";
  save(*model);
  EXPECT_FALSE(model->needsBuild());
}

TEST_F(HelpLUXModelFile, AModelThatIsCutOffWhileItIsOpenIsNotRead) {
  const auto model = open();
  save(*model);
  const std::string whole = bytes();
  for (const size_t length :
       {whole.size() - 1, whole.size() / 2, size_t{33}, size_t{1}, size_t{0}}) {
    overwrite(whole);
    ASSERT_NE(model->view(), nullptr);
    // Two changes in one tick of the file system's clock bear the same time.
    const auto time = std::filesystem::last_write_time(file());
    std::filesystem::resize_file(file(), length);
    std::filesystem::last_write_time(file(), time);
    EXPECT_TRUE(model->needsBuild());
    EXPECT_EQ(model->view(), nullptr);
    model->loadLSMMap();
    EXPECT_EQ(model->allHelpbookIDs(), Names{});
  }
}

TEST_F(HelpLUXModelFile, AViewThatIsHeldWhileTheFileIsCutOffDoesNoHarm) {
  const auto model = open();
  save(*model);
  const std::string whole = bytes();
  for (size_t length = 0; length < whole.size(); length += 61) {
    overwrite(whole);
    const auto view = model->view();
    ASSERT_NE(view, nullptr);
    std::filesystem::resize_file(file(), length);
    tests::useModel(*view);
    EXPECT_FALSE(view->checksumsMatch());
  }
}

TEST_F(HelpLUXModelFile, AViewThatIsHeldWhileTheFileIsWrittenOverDoesNoHarm) {
  const auto model = open();
  save(*model);
  const std::string whole = bytes();
  for (size_t i = 0; i < whole.size(); i += 61) {
    overwrite(whole);
    const auto view = model->view();
    ASSERT_NE(view, nullptr);
    std::fstream out(file(), std::ios::binary | std::ios::in | std::ios::out);
    out.seekp(static_cast<std::streamoff>(i));
    out << std::string(std::min<size_t>(61, whole.size() - i), '\xFF');
    out.close();
    tests::useModel(*view);
  }
}

TEST_F(HelpLUXModelFile, AModelThatIsCutOffLongAfterItWasOpenedIsNotRead) {
  tests::TestEnvironment environment;
  const auto model = open();
  save(*model);
  ASSERT_NE(model->view(), nullptr);
  environment.clock().advance(platform::Seconds(60));
  ASSERT_NE(model->view(), nullptr);
  // By now the time of the file tells.
  std::filesystem::last_write_time(
      file(), std::filesystem::last_write_time(file()) - std::chrono::hours(1));
  ASSERT_NE(model->view(), nullptr);
  environment.clock().advance(platform::Seconds(60));
  ASSERT_NE(model->view(), nullptr);
  std::filesystem::resize_file(file(), 100);
  EXPECT_EQ(model->view(), nullptr);
}

TEST_F(HelpLUXModelFile, DamageThatTheHeaderDoesNotShowIsFoundByLoading) {
  const auto model = open();
  save(*model);
  std::string damaged = bytes();
  damaged.back() = static_cast<char>(damaged.back() ^ 1);
  overwrite(damaged);
  EXPECT_FALSE(model->needsBuild());
  model->loadLSMMap();
  EXPECT_TRUE(model->needsBuild());
  EXPECT_EQ(model->view(), nullptr);
  save(*model);
  model->loadLSMMap();
  EXPECT_FALSE(model->needsBuild());
}

TEST_F(HelpLUXModelFile, AFileThatCannotBeReadNeedsToBeBuilt) {
  save(*open());
  platform::Environment environment = platform::Environment::system();
  const auto files = std::make_shared<platform::FailingFileManager>();
  environment.files = files;
  const platform::EnvironmentOverride override(std::move(environment));
  const auto model = open();
  files->fail(platform::FailingFileManager::Operation::read, EACCES);
  EXPECT_TRUE(model->needsBuild());
}

TEST_F(HelpLUXModelFile, AFailedSaveIsLoggedAndLeavesTheOldModel) {
  save(*open(), "old");
  platform::Environment environment = platform::Environment::system();
  const auto files = std::make_shared<platform::FailingFileManager>();
  const auto log = std::make_shared<platform::CapturingLogSink>();
  environment.files = files;
  environment.log = log;
  const platform::EnvironmentOverride override(std::move(environment));
  for (const auto operation : {platform::FailingFileManager::Operation::write,
                               platform::FailingFileManager::Operation::createDirectory}) {
    const auto model = open();
    model->reset();
    model->addHelpbookID("new");
    files->fail(operation, ENOSPC);
    log->clear();
    EXPECT_FALSE(model->saveWithOptions({}));
    ASSERT_EQ(log->messages(1).size(), 1U);
    EXPECT_TRUE(log->messages(1)[0].starts_with("Couldn't save the model at " + file() + ": "));
    files->recover();
    EXPECT_EQ(model->allHelpbookIDs(), Names{"old"});
    EXPECT_EQ(namesInDirectory(), Names{"LUXModel"});
  }
}

TEST_F(HelpLUXModelFile, OptionsThatNobodyCanKeepAreLoggedAndLeaveTheOldModel) {
  tests::TestEnvironment environment;
  save(*open(), "old");
  const auto model = open();
  model->reset();
  EXPECT_FALSE(model->saveWithOptions(Value::Dictionary{
      {"Address", platform::URL::URLWithString("https://example.org/").value()}}));
  EXPECT_EQ(environment.log().messages(1).size(), 1U);
  EXPECT_EQ(model->allHelpbookIDs(), Names{"old"});
}

TEST_F(HelpLUXModelFile, ViewsMayBeTakenWhileModelsAreSaved) {
  const auto model = open();
  save(*model);
  std::atomic<bool> isOver{false};
  std::atomic<size_t> damaged{0};
  std::vector<std::thread> readers;
  readers.reserve(3);
  for (int i = 0; i < 3; ++i) {
    readers.emplace_back([&, reader = i == 0 ? model : open()] {
      while (!isOver) {
        const auto view = reader->view();
        damaged += view == nullptr || !view->checksumsMatch() || reader->needsBuild() ? 1 : 0;
        reader->activity();
      }
    });
  }
  for (int i = 0; i < 20; ++i) {
    save(*model, "book" + std::to_string(i));
  }
  isOver = true;
  for (std::thread& reader : readers) {
    reader.join();
  }
  EXPECT_EQ(damaged, 0U);
}

TEST_F(HelpLUXModelFile, LeftoversOfProcessesThatHaveEndedAreDeleted) {
  const auto model = open();
  save(*model);
  const pid_t child = ::fork();
  if (child == 0) {
    ::_exit(0);
  }
  ::waitpid(child, nullptr, 0);
  const auto leave = [&](const std::string& name) {
    std::ofstream(directory() + "/" + name) << "half";
    return name;
  };
  const std::string ended = leave(".LUXModel." + std::to_string(child) + ".0.tmp");
  const std::string running = leave(".LUXModel." + std::to_string(::getpid()) + ".0.tmp");
  const Names strangers = {leave(".LUXModel.x.tmp"), leave(".Other.1.0.tmp"),
                           leave(".LUXModel." + std::to_string(child))};
  model->reset();
  const Names left = namesInDirectory();
  EXPECT_EQ(std::count(left.begin(), left.end(), ended), 0);
  EXPECT_EQ(std::count(left.begin(), left.end(), running), 1);
  for (const std::string& name : strangers) {
    EXPECT_EQ(std::count(left.begin(), left.end(), name), 1) << name;
  }
}
