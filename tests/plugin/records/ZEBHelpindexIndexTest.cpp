#include "plugin/records/ZEBHelpindexIndex.h"

#include <gtest/gtest.h>

#include <cerrno>

#include "SearchKit/IndexReader.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "tests/plugin/HelpIndexWorld.h"

using platform::Data;
using platform::Value;
using testing::ElementsAre;
using testing::IsEmpty;
using tests::anchors;
using tests::HelpIndexWorld;
using tests::keywordIndex;
using tests::page;

namespace {

constexpr const char* noRootLine = "Loading anchor dict for index with no remote root";

Data someIndex() { return keywordIndex({page("/a.html", "Alpha", "printing a page")}); }

Data luxData(Value::Dictionary attributes = {}) {
  return HelpLUXIndex::versionedDataWithAttributes(std::move(attributes));
}

// Semantic data of exactly this length; made longer by an attribute.
Data luxDataOfLength(size_t length, Value::Dictionary attributes = {}) {
  for (size_t filler = length > 400 ? length - 400 : 0; filler <= length; ++filler) {
    attributes["filler"] = std::string(filler, 'x');
    Data data = luxData(attributes);
    if (data.length() == length) {
      return data;
    }
  }
  throw std::runtime_error("no data of that length");
}

Data archive(const Value& root) { return platform::classicArchiveWithRootObject(root); }

bool liesIn(const uint8_t* bytes, const Data& data) {
  return bytes >= data.bytes() && bytes < data.bytes() + data.length();
}

}  // namespace

TEST(ZEBHelpindexIndex, CarriesWhatTheFileCarries) {
  const HelpIndexWorld world;
  const std::string path =
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()},
                                  {"SKI_ANCHOR_DATA", anchors({{"print", {"/a.html"}}})},
                                  {"SKI_USE_REMOTE_ROOT", true},
                                  {"SKI_REMOTE_ROOT", "https://help.example/book/"},
                                  {"SKI_PREFER_NETWORK_FILES", true},
                                  {"LUXIndexData", luxData()}});
  const auto index = ZEBHelpindexIndex::initWithPath(path);
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->path(), path);
  EXPECT_TRUE(index->isSearchable());
  EXPECT_TRUE(index->hasAnchors());
  EXPECT_TRUE(index->networkFilesPreferred());
  EXPECT_EQ(index->remoteRoot(), "https://help.example/book/");
  EXPECT_EQ(index->anchorDictionary(), anchors({{"print", {"/a.html"}}}));
  EXPECT_EQ(index->luxIndexData(), luxData());
  EXPECT_EQ(index->bookID(), std::nullopt);
  EXPECT_FALSE(index->isReinitialized());
  EXPECT_FALSE(index->loadedFromGeneratedCache());
  EXPECT_NE(index->copyIndexRef(), nullptr);
}

TEST(ZEBHelpindexIndex, EmptyDictionaryMakesARecordWithNothingInIt) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->isSearchable());
  EXPECT_FALSE(index->hasAnchors());
  EXPECT_FALSE(index->networkFilesPreferred());
  EXPECT_EQ(index->remoteRoot(), std::nullopt);
  EXPECT_TRUE(index->anchorDictionary().isAbsent());
  EXPECT_EQ(index->luxIndexData(), std::nullopt);
  EXPECT_EQ(index->luxIndex(), nullptr);
  EXPECT_FALSE(index->shouldUseLUXIndex());
}

TEST(ZEBHelpindexIndex, MapsTheFileOnceAndCopiesNeitherIndexNorSemanticData) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()}, {"LUXIndexData", luxData()}}));
  ASSERT_NE(index, nullptr);
  ASSERT_EQ(world.files->mappings.size(), 1U);
  const Data& mapping = world.files->mappings[0];
  EXPECT_TRUE(liesIn(index->luxIndexData()->bytes(), mapping));
  const SKIndexRef indexRef = index->copyIndexRef();
  ASSERT_NE(indexRef, nullptr);
  const auto document = searchkit::indexDocument(*indexRef, 0);
  ASSERT_TRUE(document);
  EXPECT_TRUE(liesIn(reinterpret_cast<const uint8_t*>(document->path.data()), mapping));
  EXPECT_EQ(world.files->mappings.size(), 1U);
}

TEST(ZEBHelpindexIndex, UnreadableFileYieldsNothingSilently) {
  const HelpIndexWorld world;
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(world.folder.path("missing.helpindex")), nullptr);
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(world.folder.path()), nullptr);
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(std::nullopt), nullptr);
  EXPECT_EQ(ZEBHelpindexIndex::init(), nullptr);
  const std::string path = world.write("a.helpindex", {});
  world.files->fail(platform::FailingFileManager::Operation::read, EIO);
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(path), nullptr);
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(ZEBHelpindexIndex, MalformedArchiveYieldsNothingAndOneLineAtLevelZero) {
  const HelpIndexWorld world;
  const std::string path = world.folder.write("a.helpindex", "no archive");
  std::string reason;
  try {
    platform::ClassicUnarchiver(Data::copy("no archive")).decodeRootObject();
  } catch (const platform::Exception& exception) {
    reason = exception.reason();
  }
  ASSERT_FALSE(reason.empty());
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(path), nullptr);
  EXPECT_THAT(world.log->entries(),
              ElementsAre(platform::CapturingLogSink::Entry{
                  0, "Error trying to unarchive index data. Original path is <" + path +
                         ">. Error: " + reason}));
}

TEST(ZEBHelpindexIndex, EmptyFileYieldsNothing) {
  const HelpIndexWorld world;
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(world.folder.write("a.helpindex", "")), nullptr);
}

TEST(ZEBHelpindexIndex, RootThatIsAnArrayIsRejectedWithALineAtLevelZero) {
  const HelpIndexWorld world;
  const std::string path = world.writeRoot("a.helpindex", Value::Array{"a"});
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(path), nullptr);
  EXPECT_THAT(world.log->entries(),
              ElementsAre(platform::CapturingLogSink::Entry{
                  0, "Error trying to unarchive index data. Original path is <" + path +
                         ">. Error: the root object is no dictionary"}));
}

TEST(ZEBHelpindexIndex, RootThatIsNilIsRejectedSilentlyAndChangesNothing) {
  const HelpIndexWorld world;
  platform::ClassicArchive graph;
  graph.roots = {platform::ClassicArchive::nil};
  const Data nilRoot = platform::classicarchive::encode(graph);
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(world.folder.write("a.helpindex", nilRoot.view())),
            nullptr);
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("b.helpindex", {{"SKI_ANCHOR_DATA", anchors({{"a", {"/a"}}})}}));
  ASSERT_NE(index, nullptr);
  world.log->clear();
  EXPECT_FALSE(index->reinitializeWithData(nilRoot));
  EXPECT_TRUE(index->hasAnchors());
  EXPECT_TRUE(index->isSearchable());
  EXPECT_FALSE(index->isReinitialized());
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(ZEBHelpindexIndex, WithoutRemoteRootTheLogSaysSo) {
  const HelpIndexWorld world;
  ASSERT_NE(ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {})), nullptr);
  EXPECT_THAT(world.log->entries(), ElementsAre(platform::CapturingLogSink::Entry{3, noRootLine}));
}

TEST(ZEBHelpindexIndex, LogNamesTheRemoteRootAsWrittenAndTheAnchors) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_ANCHOR_DATA", anchors({{"a", {}}})},
                                  {"SKI_USE_REMOTE_ROOT", 1},
                                  {"SKI_REMOTE_ROOT", "http://help.example/"}}));
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->remoteRoot(), "https://help.example/");
  EXPECT_FALSE(index->networkFilesPreferred());
  EXPECT_THAT(world.log->entries(),
              ElementsAre(
                  platform::CapturingLogSink::Entry{
                      3, "Loading anchor dict for index with remote root: http://help.example/"},
                  platform::CapturingLogSink::Entry{3, "anchor dict loaded"}));
}

TEST(ZEBHelpindexIndex, RemoteRootThatIsNotUsedStaysUnsetButIsLogged) {
  const HelpIndexWorld world;
  for (const Value& use : {Value(), Value(false), Value(0)}) {
    world.log->clear();
    Value::Dictionary content = {{"SKI_REMOTE_ROOT", "https://help.example/"},
                                 {"SKI_PREFER_NETWORK_FILES", true}};
    if (!use.isAbsent()) {
      content["SKI_USE_REMOTE_ROOT"] = use;
    }
    const auto index = ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", content));
    ASSERT_NE(index, nullptr);
    EXPECT_EQ(index->remoteRoot(), std::nullopt);
    EXPECT_FALSE(index->networkFilesPreferred());
    EXPECT_THAT(world.log->messages(3),
                ElementsAre("Loading anchor dict for index with remote root: "
                            "https://help.example/"));
  }
}

TEST(ZEBHelpindexIndex, RemoteRootThatIsUsedButMissingClearsTheFormerOne) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex",
                  {{"SKI_USE_REMOTE_ROOT", true}, {"SKI_REMOTE_ROOT", "https://help.example/"}}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->reinitializeWithData(archive(Value::Dictionary{})));
  EXPECT_EQ(index->remoteRoot(), "https://help.example/") << "not used: the former one stays";
  EXPECT_TRUE(
      index->reinitializeWithData(archive(Value::Dictionary{{"SKI_USE_REMOTE_ROOT", true}})));
  EXPECT_EQ(index->remoteRoot(), std::nullopt);
}

TEST(ZEBHelpindexIndex, EmptyAnchorDictionaryIsNone) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_ANCHOR_DATA", Value::Dictionary{}}}));
  ASSERT_NE(index, nullptr);
  EXPECT_FALSE(index->hasAnchors());
  EXPECT_TRUE(index->anchorDictionary().isAbsent());
  EXPECT_THAT(world.log->messages(3), ElementsAre(noRootLine));
}

TEST(ZEBHelpindexIndex, ValuesOfTheWrongKindCountAsAbsent) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", "text"},
                                  {"SKI_ANCHOR_DATA", Value::Array{"a"}},
                                  {"SKI_USE_REMOTE_ROOT", true},
                                  {"SKI_REMOTE_ROOT", Value::Array{"https://help.example/"}},
                                  {"SKI_PREFER_NETWORK_FILES", "yes"},
                                  {"LUXIndexData", "text"}}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->isSearchable());
  EXPECT_FALSE(index->hasAnchors());
  EXPECT_FALSE(index->networkFilesPreferred());
  EXPECT_EQ(index->remoteRoot(), std::nullopt);
  EXPECT_EQ(index->copyIndexRef(), nullptr);
  EXPECT_EQ(index->luxIndexData(), std::nullopt);
  EXPECT_THAT(world.log->messages(3), ElementsAre(noRootLine));
  EXPECT_THAT(world.log->messages(0), IsEmpty());
}

TEST(ZEBHelpindexIndex, RemoteSwitchThatIsNoNumberIsOff) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(world.write(
      "a.helpindex", {{"SKI_USE_REMOTE_ROOT", "1"}, {"SKI_REMOTE_ROOT", "https://help.example/"}}));
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->remoteRoot(), std::nullopt);
}

TEST(ZEBHelpindexIndex, MutableContainersAndDataAreRead) {
  using Archive = platform::ClassicArchive;
  const HelpIndexWorld world;
  Archive graph = platform::classicarchive::graph(
      Value::Dictionary{{"SKI_INDEX_DATA", someIndex()}, {"LUXIndexData", luxData()}});
  for (Archive::Node& node : graph.nodes) {
    node.nodeClass = node.nodeClass == Archive::Class::dictionary
                         ? Archive::Class::mutableDictionary
                     : node.nodeClass == Archive::Class::data ? Archive::Class::mutableData
                                                              : node.nodeClass;
  }
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.folder.write("a.helpindex", platform::classicarchive::encode(graph).view()));
  ASSERT_NE(index, nullptr);
  EXPECT_NE(index->copyIndexRef(), nullptr);
  EXPECT_EQ(index->luxIndexData(), luxData());
}

TEST(ZEBHelpindexIndex, WithoutKeywordDataIsSearchableUntilAskedAndGivesNoReference) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->isSearchable());
  EXPECT_EQ(index->copyIndexRef(), nullptr);
  EXPECT_TRUE(index->isSearchable()) << "nothing was opened that could tell otherwise";
}

TEST(ZEBHelpindexIndex, IndexWithWrongChecksumsGivesNoReferenceUntilSoundDataComes) {
  const HelpIndexWorld world;
  std::string damaged(someIndex().view());
  ASSERT_NE(SKIndexOpenWithData(platform::Data::copy(damaged)), nullptr);
  damaged.back() = static_cast<char>(damaged.back() ^ 1);
  ASSERT_NE(SKIndexOpenWithData(platform::Data::copy(damaged)), nullptr) << "opening does not tell";
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", platform::Data::copy(damaged)}}));
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->copyIndexRef(), nullptr);
  EXPECT_TRUE(index->isSearchable());
  EXPECT_TRUE(index->reinitializeWithData(
      platform::classicArchiveWithRootObject(Value::Dictionary{{"SKI_INDEX_DATA", someIndex()}})));
  EXPECT_NE(index->copyIndexRef(), nullptr);
}

TEST(ZEBHelpindexIndex, WithoutKeywordDataGivesThePreviousReferenceWhileSomebodyHoldsIt) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()}}));
  ASSERT_NE(index, nullptr);
  SKIndexRef first = index->copyIndexRef();
  ASSERT_NE(first, nullptr);
  ASSERT_TRUE(index->reinitializeWithData(archive(Value::Dictionary{})));
  EXPECT_EQ(index->copyIndexRef(), first);
  EXPECT_EQ(index->copyIndexRef(), first);
  index->disposeIndexRef(first);
  EXPECT_EQ(index->copyIndexRef(), nullptr);
}

TEST(ZEBHelpindexIndex, DoesNotOwnTheReferencesThatItHandsOut) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()}}));
  ASSERT_NE(index, nullptr);
  SKIndexRef indexRef = index->copyIndexRef();
  EXPECT_EQ(indexRef.use_count(), 1);
  index->disposeIndexRef(indexRef);
  EXPECT_EQ(indexRef, nullptr);
  index->disposeIndexRef(indexRef);
  EXPECT_EQ(indexRef, nullptr);
}

TEST(ZEBHelpindexIndex, ReferencesOutliveTheRecordAndItsFile) {
  HelpIndexWorld world;
  auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()}}));
  ASSERT_NE(index, nullptr);
  const SKIndexRef indexRef = index->copyIndexRef();
  index.reset();
  world.files->mappings.clear();
  std::filesystem::remove(world.folder.path("a.helpindex"));
  EXPECT_EQ(searchkit::indexDocumentPaths(*indexRef), std::vector<std::string>{"/a.html"});
}

TEST(ZEBHelpindexIndex, EveryReferenceIsAnIndexOfItsOwn) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()}}));
  ASSERT_NE(index, nullptr);
  const SKIndexRef first = index->copyIndexRef();
  const SKIndexRef second = index->copyIndexRef();
  EXPECT_NE(first, nullptr);
  EXPECT_NE(second, nullptr);
  EXPECT_NE(first, second);
}

TEST(ZEBHelpindexIndex, OpeningAnIndexWithoutTermsMakesTheRecordUnsearchable) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", keywordIndex({})}}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->isSearchable());
  EXPECT_NE(index->copyIndexRef(), nullptr);
  EXPECT_FALSE(index->isSearchable());
}

TEST(ZEBHelpindexIndex, OneTermIsEnoughToBeSearchable) {
  const HelpIndexWorld world;
  searchkit::Document document;
  document.path = "/a.html";
  document.body = {"word"};
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", keywordIndex({document})}}));
  ASSERT_NE(index, nullptr);
  const SKIndexRef indexRef = index->copyIndexRef();
  EXPECT_EQ(SKIndexGetMaximumTermID(indexRef), 1);
  EXPECT_TRUE(index->isSearchable());
}

TEST(ZEBHelpindexIndex, IndexThatCannotBeOpenedGivesNothingAndLeavesSearchableAsItWas) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", Data::copy("no index")}}));
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->copyIndexRef(), nullptr);
  EXPECT_TRUE(index->isSearchable());
  EXPECT_EQ(index->copyIndexRef(), nullptr);
}

TEST(ZEBHelpindexIndex, ReinitialisingReplacesEverythingAndClearsTheCacheAndDownloadMarks) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()},
                                  {"SKI_ANCHOR_DATA", anchors({{"a", {"/a.html"}}})},
                                  {"LUXIndexData", luxData()}}));
  ASSERT_NE(index, nullptr);
  ASSERT_NE(index->luxIndex(), nullptr);
  index->setBookID("book");
  index->setIsDownloading(true);
  index->setIsRebuilding(true);
  index->setLoadedFromGeneratedCache(true);
  EXPECT_TRUE(index->reinitializeWithData(
      archive(Value::Dictionary{{"SKI_ANCHOR_DATA", anchors({{"b", {"/b.html"}}})}})));
  EXPECT_TRUE(index->isReinitialized());
  EXPECT_FALSE(index->isDownloading());
  EXPECT_FALSE(index->loadedFromGeneratedCache());
  EXPECT_TRUE(index->isRebuilding());
  EXPECT_TRUE(index->isSearchable());
  EXPECT_EQ(index->bookID(), "book");
  EXPECT_EQ(index->anchorDictionary(), anchors({{"b", {"/b.html"}}}));
  EXPECT_EQ(index->luxIndex(), nullptr);
  EXPECT_EQ(index->luxIndexData(), std::nullopt);
  EXPECT_EQ(index->copyIndexRef(), nullptr);
}

TEST(ZEBHelpindexIndex, ReinitialisingWithAMalformedArchiveLeavesTheContentsAsTheyWere) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()},
                                  {"SKI_ANCHOR_DATA", anchors({{"a", {"/a.html"}}})},
                                  {"SKI_USE_REMOTE_ROOT", true},
                                  {"SKI_REMOTE_ROOT", "https://help.example/"},
                                  {"SKI_PREFER_NETWORK_FILES", true},
                                  {"LUXIndexData", luxData()}}));
  ASSERT_NE(index, nullptr);
  index->setIsDownloading(true);
  index->setLoadedFromGeneratedCache(true);
  world.log->clear();
  EXPECT_FALSE(index->reinitializeWithData(Data::copy("broken")));
  EXPECT_EQ(world.log->messages(0).size(), 1U);
  EXPECT_FALSE(index->isReinitialized());
  EXPECT_FALSE(index->isDownloading());
  EXPECT_FALSE(index->loadedFromGeneratedCache());
  EXPECT_TRUE(index->isSearchable());
  EXPECT_TRUE(index->hasAnchors());
  EXPECT_TRUE(index->networkFilesPreferred());
  EXPECT_FALSE(index->anchorDictionary().isAbsent());
  EXPECT_EQ(index->luxIndexData(), luxData());
  EXPECT_NE(index->copyIndexRef(), nullptr);
}

TEST(ZEBHelpindexIndex, ReinitialisingWithAnotherRootThanADictionaryLeavesTheRecordCleared) {
  const HelpIndexWorld world;
  const std::string path =
      world.write("a.helpindex", {{"SKI_INDEX_DATA", someIndex()},
                                  {"SKI_ANCHOR_DATA", anchors({{"a", {"/a.html"}}})},
                                  {"SKI_USE_REMOTE_ROOT", true},
                                  {"SKI_REMOTE_ROOT", "https://help.example/"},
                                  {"SKI_PREFER_NETWORK_FILES", true},
                                  {"LUXIndexData", luxData()}});
  for (const Value& root :
       {Value(Value::Array{"a"}), Value("text"), Value(7), Value(Data::copy("data"))}) {
    const auto index = ZEBHelpindexIndex::initWithPath(path);
    ASSERT_NE(index, nullptr);
    world.log->clear();
    EXPECT_FALSE(index->reinitializeWithData(archive(root)));
    EXPECT_THAT(world.log->entries(),
                ElementsAre(platform::CapturingLogSink::Entry{
                    0, "Error trying to unarchive index data. Original path is <" + path +
                           ">. Error: the root object is no dictionary"}));
    EXPECT_FALSE(index->isReinitialized());
    EXPECT_FALSE(index->isSearchable());
    EXPECT_FALSE(index->hasAnchors());
    EXPECT_FALSE(index->networkFilesPreferred());
    EXPECT_EQ(index->remoteRoot(), "https://help.example/");
    EXPECT_TRUE(index->anchorDictionary().isAbsent());
    EXPECT_EQ(index->luxIndexData(), std::nullopt);
    EXPECT_EQ(index->copyIndexRef(), nullptr);
    // The lock was given back: the record can be filled again.
    EXPECT_TRUE(index->reinitializeWithData(archive(Value::Dictionary{})));
  }
}

TEST(ZEBHelpindexIndex, FailedReinitialisationKeepsTheMarkOfAnEarlierOne) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {}));
  ASSERT_NE(index, nullptr);
  ASSERT_TRUE(index->reinitializeWithData(archive(Value::Dictionary{})));
  EXPECT_FALSE(index->reinitializeWithData(Data()));
  EXPECT_TRUE(index->isReinitialized());
}

TEST(ZEBHelpindexIndex, LuxIndexIsMadeOnceAndTakesThePlaceOfItsData) {
  const HelpIndexWorld world;
  // Something in a place that means nothing: the index's own form is without it.
  std::string given(luxData({{HelpLUXIndexAttributeLanguageKey, "de"}}).view());
  given[28] = 'x';
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"LUXIndexData", Data::copy(given)}}));
  ASSERT_NE(index, nullptr);
  const uint8_t* heldBytes = index->luxIndexData()->bytes();
  EXPECT_EQ(index->luxIndexData()->bytes(), heldBytes) << "asking does not make the index";
  EXPECT_EQ(index->luxIndexData(), Data::copy(given));
  const auto lux = index->luxIndex();
  ASSERT_NE(lux, nullptr);
  EXPECT_EQ(lux->attributes()[HelpLUXIndexAttributeLanguageKey], Value("de"));
  EXPECT_EQ(index->luxIndex(), lux);
  EXPECT_EQ(index->luxIndexData(), lux->versionedData());
  EXPECT_NE(index->luxIndexData(), Data::copy(given));
}

TEST(ZEBHelpindexIndex, SemanticDataThatMakesNoIndexIsKept) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"LUXIndexData", Data::copy("no semantic data")}}));
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->luxIndex(), nullptr);
  EXPECT_EQ(index->luxIndexData(), Data::copy("no semantic data"));
  EXPECT_EQ(index->luxIndex(), nullptr);
  EXPECT_FALSE(index->shouldUseLUXIndex());
}

TEST(ZEBHelpindexIndex, SemanticDataAboveTenThousandBytesIsUsedWithoutBeingRead) {
  const HelpIndexWorld world;
  const Data data = luxDataOfLength(10001, {{HelpLUXIndexAttributeIgnoreLUXKey, true}});
  const auto index =
      ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {{"LUXIndexData", data}}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->shouldUseLUXIndex());
  EXPECT_TRUE(liesIn(index->luxIndexData()->bytes(), world.files->mappings.at(0)))
      << "the index was not made";
  // Once the index exists, it is asked.
  ASSERT_NE(index->luxIndex(), nullptr);
  EXPECT_FALSE(index->shouldUseLUXIndex());
}

TEST(ZEBHelpindexIndex, BrokenSemanticDataAboveTenThousandBytesIsUsedAllTheSame) {
  const HelpIndexWorld world;
  const auto index = ZEBHelpindexIndex::initWithPath(
      world.write("a.helpindex", {{"LUXIndexData", Data::adopt(std::string(10001, 'x'))}}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->shouldUseLUXIndex());
}

TEST(ZEBHelpindexIndex, SemanticDataOfTenThousandBytesIsMadeAnIndexAndAsked) {
  const HelpIndexWorld world;
  const struct {
    Value ignore;
    bool used;
  } cases[] = {{true, false}, {1, false}, {false, true}, {"yes", true}};
  for (const auto& [ignore, used] : cases) {
    const Data data = luxDataOfLength(10000, {{HelpLUXIndexAttributeIgnoreLUXKey, ignore}});
    const auto index =
        ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {{"LUXIndexData", data}}));
    ASSERT_NE(index, nullptr);
    EXPECT_EQ(index->shouldUseLUXIndex(), used);
    EXPECT_FALSE(liesIn(index->luxIndexData()->bytes(), world.files->mappings.back()))
        << "the index was made";
  }
}

TEST(ZEBHelpindexIndex, SmallSemanticDataWithoutTheMarkIsUsed) {
  const HelpIndexWorld world;
  const auto index =
      ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {{"LUXIndexData", luxData()}}));
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(index->shouldUseLUXIndex());
}

TEST(ZEBHelpindexIndex, RecordsFromDictionariesDoNotExist) {
  const HelpIndexWorld world;
  for (const Value& dictionary :
       {Value(), Value(Value::Dictionary{}),
        Value(Value::Dictionary{{"SKI_INDEX_DATA", someIndex()}}), Value(Value::Array{})}) {
    EXPECT_EQ(ZEBHelpindexIndex::indexWithDictionary(dictionary), nullptr);
    EXPECT_EQ(ZEBHelpindexIndex::initWithDictionary(dictionary), nullptr);
  }
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(ZEBHelpindexIndex, DescribesPathAnchorsAndSearchability) {
  const HelpIndexWorld world;
  const std::string path = world.write(
      "a.helpindex",
      {{"SKI_ANCHOR_DATA", anchors({{"a", {"/a.html"}}})}, {"SKI_INDEX_DATA", keywordIndex({})}});
  const auto index = ZEBHelpindexIndex::initWithPath(path);
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->description(), "path: " + path + " hasAnchors=1 searchable=1");
  index->copyIndexRef();
  EXPECT_EQ(index->description(), "path: " + path + " hasAnchors=1 searchable=0");
  index->reinitializeWithData(archive(Value::Dictionary{}));
  EXPECT_EQ(index->description(), "path: " + path + " hasAnchors=0 searchable=1");
}
