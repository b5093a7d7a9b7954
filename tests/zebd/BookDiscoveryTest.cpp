#include "zebd/BookDiscovery.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "tests/platform/TemporaryFolder.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using zebd::BookDiscovery;
using zebd::Catalogue;
using zebd::CatalogueEntry;

class BookDiscoveryTest : public testing::Test {
 protected:
  void page(const std::string& name, const std::string& title) {
    folder.write(name, "<title>" + title + "</title><p>Text.</p>");
  }
  void helpBook(const std::string& name, const std::string& bookID, const std::string& title) {
    folder.write(name + "/Info.plist",
                 "<plist version=\"1.0\"><dict><key>ZEBBookIdentifier</key>"
                 "<string>" +
                     bookID + "</string><key>ZEBBookTitle</key><string>" + title +
                     "</string></dict></plist>");
    page(name + "/index.html", title);
  }
  void addInstalled(const std::vector<std::string>& dataFolders) {
    std::vector<std::string> paths;
    for (const std::string& name : dataFolders) {
      paths.push_back(folder.path(name));
    }
    discovery.addInstalled(paths, {"de", "en"});
  }
  std::vector<std::string> found() const {
    std::vector<std::string> lines;
    for (const CatalogueEntry& entry : discovery.books()) {
      lines.push_back(entry.bookID + ": " + entry.title);
    }
    return lines;
  }
  CatalogueEntry entry(const std::string& name, const std::string& bookID) const {
    std::string reason;
    BookDiscovery other([](const std::string&, const std::string&) {});
    EXPECT_TRUE(other.add(folder.path(name), bookID, {}, reason)) << reason;
    return other.books().front();
  }

  tests::TemporaryFolder folder;
  std::map<std::string, std::string> reasons;
  BookDiscovery discovery{
      [this](const std::string& path, const std::string& reason) { reasons[path] = reason; }};
};

TEST_F(BookDiscoveryTest, FindsHelpBooksHelpOfApplicationsAndManuals) {
  helpBook("share/zeb/books/garden", "org.garden", "Garden");
  page("share/help/de/editor/index.html", "Texteditor");
  page("share/doc/tool/html/index.html", "Tool");
  addInstalled({"share"});
  EXPECT_THAT(found(), ElementsAre("org.garden: Garden", "editor: Texteditor", "doc.tool: Tool"));
}

TEST_F(BookDiscoveryTest, EarlierDataFolderWins) {
  helpBook("own/zeb/books/garden", "org.garden", "My garden");
  helpBook("share/zeb/books/garden", "org.garden", "Garden");
  page("own/help/en/editor/index.html", "My editor");
  page("share/help/en/editor/index.html", "Editor");
  addInstalled({"own", "share"});
  EXPECT_THAT(found(), ElementsAre("org.garden: My garden", "editor: My editor"));
  EXPECT_EQ(reasons[folder.path("share/zeb/books/garden")], "there is another book \"org.garden\"");
}

TEST_F(BookDiscoveryTest, FolderIsNoSecondBookOfAnIdentifierThatAnotherHas) {
  page("one/garden/index.html", "Garden");
  page("kitchen/index.html", "Kitchen");
  page("two/garden/index.html", "Another garden");
  std::string reason;
  EXPECT_EQ(discovery.add(folder.path("one/garden"), std::nullopt, {}, reason), "garden");
  EXPECT_EQ(discovery.add(folder.path("kitchen"), std::nullopt, {}, reason), "kitchen");
  EXPECT_EQ(discovery.add(folder.path("one/garden"), std::nullopt, {}, reason), "garden");
  EXPECT_EQ(reason, "") << "the same folder twice is no mistake";
  EXPECT_EQ(discovery.add(folder.path("two/garden"), std::nullopt, {}, reason), std::nullopt);
  EXPECT_EQ(reason, "there is another book \"garden\"");
  EXPECT_THAT(found(), ElementsAre("garden: Garden", "kitchen: Kitchen"));
}

TEST_F(BookDiscoveryTest, LanguageOfALaterDataFolderCountsWhereTheEarlierHasItNot) {
  page("own/help/en/editor/index.html", "Editor");
  page("share/help/de/editor/index.html", "Texteditor");
  addInstalled({"own", "share"});
  EXPECT_THAT(found(), ElementsAre("editor: Texteditor"));
}

TEST_F(BookDiscoveryTest, FolderOfBooksWithoutInformationListIsNoBook) {
  page("share/zeb/books/garden/index.html", "Garden");
  addInstalled({"share"});
  EXPECT_THAT(found(), IsEmpty());
}

TEST_F(BookDiscoveryTest, RegisteredManualIsOpenedByThePageThatItsRegistrationNames) {
  page("share/doc/bc/bc.html", "Calculator");
  folder.write("share/doc-base/bc",
               "Document: bc\nTitle: The calculator\nSection: Science\n\n"
               "Format: text\nFiles: /usr/share/doc/bc/bc.txt\n\n"
               "Format: HTML\nIndex: /usr/share/doc/bc/bc.html\nFiles: /usr/share/doc/bc/*.html\n");
  addInstalled({"share"});
  EXPECT_THAT(found(), ElementsAre("doc.bc: Calculator"));
  EXPECT_EQ(discovery.books().front().accessPagePath, folder.path("share/doc/bc/bc.html"));
}

TEST_F(BookDiscoveryTest, FolderThatIsRegisteredTooIsOneBook) {
  page("share/doc/tool/html/index.html", "Tool");
  folder.write("share/doc-base/tool",
               "document: tool\nformat: html\nindex: /usr/share/doc/tool/html/index.html\n");
  addInstalled({"share"});
  EXPECT_THAT(found(), ElementsAre("doc.tool: Tool"));
}

TEST_F(BookDiscoveryTest, RegistrationsThatNameNoPageInTheirPlaceArePassedOver) {
  page("elsewhere/index.html", "Elsewhere");
  page("share/doc/tool/tool.html", "Tool");
  const auto registration = [this](const std::string& name, const std::string& text) {
    return folder.write("share/doc-base/" + name, text);
  };
  const std::string missing =
      registration("missing", "Document: m\nFormat: HTML\nIndex: /usr/share/doc/m/index.html\n");
  const std::string outside = registration(
      "outside", "Document: o\nFormat: HTML\nIndex: " + folder.path("elsewhere/index.html") + "\n");
  const std::string above = registration(
      "above", "Document: a\nFormat: HTML\nIndex: /usr/share/doc/../../../elsewhere/index.html\n");
  registration("text", "Document: t\nFormat: text\nIndex: /usr/share/doc/tool/tool.html\n");
  registration("nameless", "Format: HTML\nIndex: /usr/share/doc/tool/tool.html\n");
  registration("noise", std::string("\0\xff: \n:::\nIndex", 14));
  registration("empty", "");
  addInstalled({"share"});
  EXPECT_THAT(found(), IsEmpty());
  EXPECT_EQ(reasons[missing], "the page that it names is not there");
  EXPECT_EQ(reasons[outside], "the page that it names is not there");
  EXPECT_EQ(reasons[above], "the page that it names is not there");
}

TEST_F(BookDiscoveryTest, RegisteredManualThatIsALinkToAnotherPlaceIsPassedOver) {
  page("elsewhere/index.html", "Elsewhere");
  std::filesystem::create_directories(folder.path("share/doc"));
  std::filesystem::create_symlink(folder.path("elsewhere"), folder.path("share/doc/tool"));
  folder.write("share/doc-base/tool",
               "Document: tool\nFormat: HTML\nIndex: /usr/share/doc/tool/index.html\n");
  addInstalled({"share"});
  EXPECT_THAT(found(), IsEmpty());
  EXPECT_EQ(reasons[folder.path("share/doc/tool")], "it is a link to another place");
}

TEST_F(BookDiscoveryTest, KnownBooksAreLookedAtAgainAndThoseWithoutTheirFolderAreGone) {
  page("a/index.html", "A");
  page("b/index.html", "B");
  const Catalogue catalogue(folder.path("catalogue"));
  catalogue.store(entry("a", "org.a"));
  catalogue.store(entry("b", "org.b"));
  std::filesystem::remove_all(folder.path("a"));
  page("b/index.html", "Better");
  const std::vector<CatalogueEntry> gone = discovery.addKnown(catalogue);
  ASSERT_EQ(gone.size(), 1U);
  EXPECT_EQ(gone.front().bookID, "org.a");
  EXPECT_THAT(found(), ElementsAre("org.b: Better"));
}

TEST_F(BookDiscoveryTest, BookThatHasMovedIsNotGone) {
  page("a/index.html", "A");
  const Catalogue catalogue(folder.path("catalogue"));
  catalogue.store(entry("a", "doc.a"));
  std::filesystem::remove_all(folder.path("a"));
  page("share/doc/a/html/index.html", "A");
  addInstalled({"share"});
  EXPECT_THAT(discovery.addKnown(catalogue), IsEmpty());
  EXPECT_THAT(found(), ElementsAre("doc.a: A"));
}

}  // namespace
