// Classes and archives that the tests of the keyed archive share.
#pragma once

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/KeyedArchive.h"
#include "platform/PropertyList.h"

namespace platform::test {

/// An object with one of everything that an object can encode.
struct Card : KeyedCodable {
  std::optional<std::string> label;
  int64_t weight = 0;
  KeyedObject note;

  std::string archiveClassName() const override { return "Card"; }

  void encodeWithCoder(KeyedArchiver& coder) const override {
    coder.encodeObject(label ? KeyedObject(Value(*label)) : KeyedObject(), "label");
    coder.encodeInteger(weight, "weight");
    coder.encodeObject(note, "$note");
  }

  static void registerClass() {
    KeyedUnarchiver::registerClass("Card", [](KeyedUnarchiver& coder) {
      auto card = std::make_shared<Card>();
      card->label = coder.decodeObjectOfClasses({KeyedUnarchiver::stringClass}, "label")
                        .value()
                        .stringValue();
      card->weight = coder.decodeInteger("weight").value_or(0);
      card->note = coder.decodeObjectOfClasses({"Card", KeyedUnarchiver::arrayClass}, "$note");
      // A negative weight stands for content that makes no card.
      return card->weight < 0 ? nullptr : std::static_pointer_cast<const KeyedCodable>(card);
    });
  }
};

inline std::shared_ptr<Card> card(const std::string& label, int64_t weight = 0) {
  auto made = std::make_shared<Card>();
  made->label = label;
  made->weight = weight;
  return made;
}

/// The card that a decoded object is; a test failure and null for anything else.
inline std::shared_ptr<const Card> asCard(const KeyedObject& object) {
  auto found = std::dynamic_pointer_cast<const Card>(object.object());
  EXPECT_TRUE(found);
  return found;
}

/// An archive from its object table and roots, written out as they stand.
inline Data archiveOf(Value::Array objects, Value::Dictionary roots,
                      PropertyListFormat format = PropertyListFormat::binary) {
  return dataFromPropertyList(Value::Dictionary{{"$archiver", "NSKeyedArchiver"},
                                                {"$version", 100000},
                                                {"$objects", std::move(objects)},
                                                {"$top", std::move(roots)}},
                              format);
}

inline Value classRecord(const std::string& name) {
  return Value::Dictionary{{"$classname", name}, {"$classes", Value::Array{name, "NSObject"}}};
}

/// The reason of the exception that `body` throws; a test failure when it throws none.
template <typename Body>
std::string reasonOf(const char* name, Body body) {
  try {
    body();
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), name);
    return exception.reason();
  }
  ADD_FAILURE() << "nothing was thrown";
  return {};
}

}  // namespace platform::test
