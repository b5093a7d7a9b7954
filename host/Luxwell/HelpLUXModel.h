// Language models of groups of help books.
#pragma once

#include <string>
#include <string_view>

#include "platform/Value.h"

/// What is known of model groups without opening a model. A group is a family of books that are
/// searched together; groups and weights come from a group list, a property list:
///
///     {"DefaultGroup": "Applications",
///      "Groups": {"System": {"Weight": 1.5, "Books": {"org.zeb.manual": {"Weight": 2.0}}}}}
///
/// A book that no group names belongs to the default group; of several groups that name one, the
/// first by name has it. A weight that is not given, or not above 0, is 0, which means: no weight.
/// Identifiers are taken as they are, versions included.
/// Thread-safety: internally synchronised.
class HelpLUXModel {
 public:
  /// The list in force from now on; what is not as above counts as not there. Without a list there
  /// is the default group "Default" alone.
  static void setGroupList(platform::Value groupList);

  static std::string modelGroupNameForHelpbookID(std::string_view helpbookID);
  static float combiningWeightForModelGroupName(std::string_view modelGroupName);
  static float combiningWeightForHelpbookID(std::string_view helpbookID);
};
