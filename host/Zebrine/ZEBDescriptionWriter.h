// Builds the picture of a value, within bounds.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/Value.h"

/// Appends to one string until that is as long as a description may be, and from then on nothing.
/// Thread-safety: confined to one thread.
class ZEBDescriptionWriter {
 public:
  /// False once the description is full; a loop over many elements may end then.
  bool text(std::string_view text);
  bool quoted(std::string_view text);

  /// A value inside a container: strings are quoted.
  void element(const platform::Value& value, int depth);
  void array(const platform::Value::Array& array, int depth);
  void dictionary(const platform::Value::Dictionary& dictionary, int depth);
  void data(const platform::Data& data);
  void date(const platform::Date& date);

  std::string take() { return std::move(_out); }

 private:
  std::string _out;
  bool _full = false;
};
