// `zeb doctor`: what keeps help from being found.
#pragma once

#include <vector>

#include "zeb/CommandLine.h"
#include "zeb/Console.h"
#include "zeb/DaemonState.h"
#include "zeb/Finding.h"
#include "zebd/Catalogue.h"
#include "zebd/Installation.h"

namespace zeb {

/// Looks at the installation, the daemon (where that is wanted), and the books, and tells what is
/// wrong: ExitCode::success when nothing is, else the status of nothingFound. Servers are asked
/// only where the command says so.
ExitCode examine(const DoctorCommand& command, const zebd::Catalogue& catalogue,
                 const zebd::Installation& installation, const Waiting& waiting, bool asksDaemon,
                 Console& console);

/// What is wrong with the daemon, if anything: that there is none is no fault.
std::vector<Finding> findingsOfDaemon(const DaemonState& state, const std::string& ownVersion);

}  // namespace zeb
