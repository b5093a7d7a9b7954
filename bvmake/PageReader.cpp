#include "bvmake/PageReader.h"

#include <fmt/format.h>
#include <libxml/parser.h>

#include "bvmake/CharacterSet.h"
#include "bvmake/HTMLPage.h"
#include "bvmake/MallardPage.h"
#include "platform/Files.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

std::optional<std::string> textOfPage(std::string_view bytes, Markup markup,
                                      platform::Error* error) {
  // Two threads that begin with their first page at once could wait for each other for ever if
  // libxml2 were left to set itself up when it is first used.
  [[maybe_unused]] static const bool initialized = (xmlInitParser(), true);
  std::optional<std::string> text;
  if (bytes.size() <= maximumPageSize) {
    text = textFromBytes(bytes, markup);
  }
  if (!text && error != nullptr) {
    *error = bytes.size() > maximumPageSize ? tooLargeError()
                                            : platform::formatError("no text, but binary data");
  }
  return text;
}

}  // namespace

std::optional<PageKind> pageKindOfFileName(std::string_view name) {
  const std::string extension = platform::lowercaseString(platform::pathExtension(name));
  if (extension == "html" || extension == "htm" || extension == "xhtml" || extension == "xht") {
    return PageKind::html;
  }
  if (extension == "page") {
    return PageKind::mallard;
  }
  return name == docBookFileName ? std::optional(PageKind::docBook) : std::nullopt;
}

platform::Error tooLargeError() {
  return platform::formatError(fmt::format("larger than {} bytes", maximumPageSize));
}

std::optional<Page> readPage(PageKind kind, std::string_view bytes, platform::Error* error) {
  const bool isHTML = kind == PageKind::html;
  std::optional<std::string> text = textOfPage(bytes, isHTML ? Markup::html : Markup::xml, error);
  if (!text) {
    return std::nullopt;
  }
  return isHTML ? readHTMLPage(std::move(*text), error) : readMallardPage(std::move(*text), error);
}

std::optional<DocBookPages> readDocBookPages(const std::string& name, std::string_view bytes,
                                             const DocBookLoader& load, platform::Error* error) {
  std::optional<std::string> text = textOfPage(bytes, Markup::xml, error);
  return text ? readDocBook({name, std::move(*text)}, load, error) : std::nullopt;
}

}  // namespace bvmake
