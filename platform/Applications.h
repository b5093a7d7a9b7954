// The applications of the desktop: those that run, and those that are installed.
#pragma once

#include <string>
#include <vector>

#include "platform/URL.h"

namespace platform {

/// Identifiers, in reverse-DNS form, of the programs that run in the user's session and say so: the
/// well-known names on the session's message bus. Empty where there is no bus. Asks anew each time.
std::vector<std::string> systemRunningApplications();

/// Puts the file URLs of the installed applications into `applicationURLs`: their desktop entries
/// in the folder "applications" of each of the user's data folders (XDG_DATA_HOME, XDG_DATA_DIRS),
/// each entry's name once, the folder named first wins. Returns 0, or an error number when none of
/// the folders can be read.
int LSCopyAllApplicationURLs(std::vector<URL>& applicationURLs);

}  // namespace platform
