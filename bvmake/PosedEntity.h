// Entities as the XML parser wants to be handed them.
#pragma once

#include <libxml/entities.h>

#include <string>
#include <utility>

namespace bvmake {

/// An entity that poses as a predefined one, whose text the parser takes as it is and never looks
/// into; or, by reference, as one in another file, of which the parser only tells that it stands
/// there. Either way nothing is expanded behind our back. The node points into the object.
struct PosedEntity {
  enum class Pose { text, reference };

  PosedEntity(std::string entityName, std::string text, Pose pose = Pose::text)
      : name(std::move(entityName)), content(std::move(text)) {
    node.type = XML_ENTITY_DECL;
    node.etype =
        pose == Pose::text ? XML_INTERNAL_PREDEFINED_ENTITY : XML_EXTERNAL_GENERAL_PARSED_ENTITY;
    node.name = reinterpret_cast<const xmlChar*>(name.c_str());
    node.content = reinterpret_cast<xmlChar*>(content.data());
    // The parser hands over the raw text of entities that have none yet, and nobody would free it.
    node.orig = node.content;
    node.length = static_cast<int>(content.size());
  }
  PosedEntity(const PosedEntity&) = delete;
  PosedEntity& operator=(const PosedEntity&) = delete;

  std::string name;
  std::string content;
  xmlEntity node = {};
};

}  // namespace bvmake
