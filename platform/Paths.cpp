#include <vector>

#include "platform/Files.h"

namespace platform {

namespace {

std::string_view withoutTrailingSlashes(std::string_view path) {
  while (path.size() > 1 && path.back() == '/') {
    path.remove_suffix(1);
  }
  return path;
}

}  // namespace

std::string stringByDeletingLastPathComponent(std::string_view path) {
  path = withoutTrailingSlashes(path);
  const size_t slash = path.rfind('/');
  if (slash == std::string_view::npos) {
    return {};
  }
  return std::string(withoutTrailingSlashes(path.substr(0, slash == 0 ? 1 : slash)));
}

std::string lastPathComponent(std::string_view path) {
  path = withoutTrailingSlashes(path);
  if (path == "/") {
    return "/";
  }
  const size_t slash = path.rfind('/');
  return std::string(slash == std::string_view::npos ? path : path.substr(slash + 1));
}

std::string pathExtension(std::string_view path) {
  const std::string name = lastPathComponent(path);
  const size_t dot = name.rfind('.');
  return dot == std::string::npos || dot == 0 ? std::string() : name.substr(dot + 1);
}

std::string stringByAppendingPathComponent(std::string_view path, std::string_view component) {
  if (path.empty()) {
    return std::string(component);
  }
  std::string joined(withoutTrailingSlashes(path));
  while (component.starts_with('/')) {
    component.remove_prefix(1);
  }
  if (component.empty()) {
    return joined;
  }
  if (joined.back() != '/') {
    joined += '/';
  }
  joined += component;
  return joined;
}

std::string stringByAppendingPathExtension(std::string_view path, std::string_view extension) {
  std::string joined(withoutTrailingSlashes(path));
  joined += '.';
  joined += extension;
  return joined;
}

std::string stringByStandardizingPath(std::string_view path) {
  const bool absolute = path.starts_with('/');
  std::vector<std::string_view> components;
  for (size_t start = 0; start <= path.size();) {
    const size_t end = std::min(path.find('/', start), path.size());
    const std::string_view component = path.substr(start, end - start);
    start = end + 1;
    if (component.empty() || component == ".") {
      continue;
    }
    if (component == ".." && absolute) {
      if (!components.empty()) {
        components.pop_back();
      }
      continue;
    }
    components.push_back(component);
  }
  std::string joined = absolute ? "/" : "";
  for (size_t i = 0; i < components.size(); ++i) {
    if (i > 0) {
      joined += '/';
    }
    joined += components[i];
  }
  return joined;
}

}  // namespace platform
