// Entities as the XML parser wants to be handed them.
#pragma once

#include <libxml/entities.h>

#include <string>
#include <utility>

namespace bvmake {

/// An entity in one of three poses, in none of which anything is expanded behind our back. The node
/// points into the object.
struct PosedEntity {
  enum class Pose {
    /// A predefined one: between elements the parser takes its text as it is and never looks into
    /// it. In attributes it takes the first byte, which is good for characters of ASCII only.
    text,
    /// One in another file, of which the parser only tells that it stands there. An error in
    /// attributes.
    reference,
    /// One without content: attributes have "&name;" in their value.
    name,
  };

  PosedEntity(std::string entityName, std::string text, Pose pose = Pose::text)
      : name(std::move(entityName)), content(std::move(text)) {
    node.type = XML_ENTITY_DECL;
    node.etype = pose == Pose::text        ? XML_INTERNAL_PREDEFINED_ENTITY
                 : pose == Pose::reference ? XML_EXTERNAL_GENERAL_PARSED_ENTITY
                                           : XML_INTERNAL_GENERAL_ENTITY;
    node.name = reinterpret_cast<const xmlChar*>(name.c_str());
    if (pose == Pose::name) {
      return;
    }
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
