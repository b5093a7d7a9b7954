// Keyed archives: every root is decoded with every class allowed; what comes out is archived again
// and has to come back.
#include <cstdint>
#include <cstdlib>
#include <utility>

#include "platform/KeyedArchive.h"
#include "platform/PropertyList.h"

using namespace platform;

namespace {

// Reads one of everything under a few names, other objects of its class included.
struct Card : KeyedCodable {
  KeyedObject label;
  KeyedObject note;
  std::optional<int64_t> weight;

  std::string archiveClassName() const override { return "Card"; }
  void encodeWithCoder(KeyedArchiver& coder) const override {
    coder.encodeObject(label, "label");
    coder.encodeObject(note, "$note");
    if (weight) {
      coder.encodeInteger(*weight, "weight");
    }
  }
};

const std::vector<std::string>& allowedClasses() {
  static const std::vector<std::string> classes = {
      "Card",
      KeyedUnarchiver::stringClass,
      KeyedUnarchiver::numberClass,
      KeyedUnarchiver::dataClass,
      KeyedUnarchiver::arrayClass,
      KeyedUnarchiver::dictionaryClass,
  };
  return classes;
}

std::shared_ptr<const KeyedCodable> makeCard(KeyedUnarchiver& coder) {
  auto card = std::make_shared<Card>();
  card->label = coder.decodeObjectOfClasses({KeyedUnarchiver::stringClass}, "label");
  card->note = coder.decodeObjectOfClasses(allowedClasses(), "$note");
  card->weight = coder.decodeInteger("weight");
  coder.decodeBool("weight");
  coder.decodeDouble("weight");
  coder.decodeBytes("weight");
  return card->weight == -1 ? nullptr : card;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
  static const bool registered = (KeyedUnarchiver::registerClass("Card", makeCard), true);
  static_cast<void>(registered);
  const Data data = Data::copy({reinterpret_cast<const char*>(bytes), size});
  KeyedObject root;
  try {
    KeyedUnarchiver unarchiver(data);
    for (const char* key : {"items", "KnownIndices", "root"}) {
      try {
        root = unarchiver.decodeObjectOfClasses(allowedClasses(), key);
      } catch (const Exception&) {
        root = {};
      }
    }
    unarchiver.finishDecoding();
  } catch (const Exception&) {
    return 0;
  }
  KeyedArchiver archiver;
  archiver.encodeObject(root, "root");
  KeyedUnarchiver again(archiver.finishEncoding());
  if (again.decodeObjectOfClasses(allowedClasses(), "root").isNil() != root.isNil()) {
    std::abort();
  }
  return 0;
}
