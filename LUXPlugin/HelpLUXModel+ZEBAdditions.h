// The model operations that the plug-in uses for books with versioned identifiers.
#pragma once

#include <string>
#include <string_view>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Value.h"

// Each reduces the identifier to its unversioned form first, so that versions never reach the
// semantic framework, and does then what HelpLUXModel's function of the same name without the
// prefix does.

inline std::string zeb_modelGroupNameForHelpbookID(std::string_view helpbookID) {
  return HelpLUXModel::modelGroupNameForHelpbookID(
      ZEBHelpBook::unversionedbookIDFromBookID(helpbookID));
}

inline float zeb_combiningWeightForHelpbookID(std::string_view helpbookID) {
  return HelpLUXModel::combiningWeightForHelpbookID(
      ZEBHelpBook::unversionedbookIDFromBookID(helpbookID));
}

/// A dictionary; see HelpLUXModel.
inline platform::Value zeb_helpbookPropertiesForHelpbookID(std::string_view helpbookID,
                                                           std::string_view modelGroupName) {
  return HelpLUXModel::helpbookPropertiesForHelpbookID(
      ZEBHelpBook::unversionedbookIDFromBookID(helpbookID), modelGroupName);
}

inline bool zeb_modelExistsForHelpbookID(std::string_view helpbookID, std::string_view language) {
  return HelpLUXModel::modelExistsForHelpbookID(
      ZEBHelpBook::unversionedbookIDFromBookID(helpbookID), language);
}
