// What processes leave that end in the middle of FileManager::writeAtomically().
#pragma once

#include <string>

namespace platform {

/// Deletes the temporary files in the folder that were to become the file of that name, or, without
/// a name, any file, and whose process has ended. Those of running processes stay, and so does
/// everything where the processes cannot be listed. Goes through Environment's files and process
/// table. Thread-safety: internally synchronised (it has no state of its own).
void removeAbandonedFiles(const std::string& folder, const std::string& name = {});

}  // namespace platform
