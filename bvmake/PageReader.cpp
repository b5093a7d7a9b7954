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

std::optional<Page> refuse(platform::Error* error, std::string description) {
  if (error != nullptr) {
    *error = platform::formatError(std::move(description));
  }
  return std::nullopt;
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
  return std::nullopt;
}

platform::Error tooLargeError() {
  return platform::formatError(fmt::format("larger than {} bytes", maximumPageSize));
}

std::optional<Page> readPage(PageKind kind, std::string_view bytes, platform::Error* error) {
  if (bytes.size() > maximumPageSize) {
    return refuse(error, tooLargeError().description);
  }
  // Two threads that begin with their first page at once could wait for each other for ever if
  // libxml2 were left to set itself up when it is first used.
  [[maybe_unused]] static const bool initialized = (xmlInitParser(), true);
  const Markup markup = kind == PageKind::html ? Markup::html : Markup::xml;
  std::optional<std::string> text = textFromBytes(bytes, markup);
  if (!text) {
    return refuse(error, "no text, but binary data");
  }
  return kind == PageKind::html ? readHTMLPage(std::move(*text), error)
                                : readMallardPage(std::move(*text), error);
}

}  // namespace bvmake
