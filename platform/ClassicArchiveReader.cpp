#include "platform/ClassicArchiveReader.h"

#include <utility>

namespace platform::classicarchive {

namespace {

class GraphSink {
 public:
  explicit GraphSink(const Data& data) : _data(data) {}

  void readHeader(ClassicArchive::ByteOrder byteOrder, uint8_t streamerVersion,
                  int64_t systemVersion) {
    _archive.byteOrder = byteOrder;
    _archive.streamerVersion = streamerVersion;
    _archive.systemVersion = systemVersion;
  }
  void addObject(Class nodeClass) { _archive.nodes.emplace_back().nodeClass = nodeClass; }
  void setBytes(NodeIndex index, Class /*nodeClass*/, size_t offset, size_t length) {
    _archive.nodes[index].bytes = _data.slice(offset, length);
  }
  void setScalars(NodeIndex index, std::string_view typeCode, const ScalarType& /*type*/,
                  std::vector<Scalar>&& values) {
    _archive.nodes[index].scalars = {std::string(typeCode), std::move(values)};
  }
  void openContainer(NodeIndex index, size_t childCount) {
    _archive.nodes[index].children.reserve(childCount);
  }
  void addChild(NodeIndex parent, NodeIndex child) {
    _archive.nodes[parent].children.push_back(child);
  }
  void finishObject(NodeIndex /*index*/, Class /*nodeClass*/) {}
  void addRoot(NodeIndex root) { _archive.roots.push_back(root); }

  ClassicArchive take() { return std::move(_archive); }

 private:
  const Data& _data;
  ClassicArchive _archive;
};

}  // namespace

ClassicArchive decode(const Data& data) {
  GraphSink sink(data);
  Reader<GraphSink>(data, allClasses, sink).read();
  return sink.take();
}

}  // namespace platform::classicarchive
