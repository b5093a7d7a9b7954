// Whether a help-index file is sound.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "bvmake/Run.h"
#include "platform/Value.h"

namespace bvmake {

class Report;

/// Most problems that are told of one part of a file.
inline constexpr size_t maximumProblemCount = 100;

/// What is wrong with the dictionary of a help-index file, one line of text each: the kinds of the
/// values, every byte of the keyword index and of the semantic data, the anchors, and whether all
/// three speak of the same pages. Values of any kind are taken.
std::vector<std::string> helpIndexProblems(const platform::Value& root);

/// Checks the file and appends to `output` one line for each problem, with the file's name, and a
/// last one that says whether it is sound. ExitCode::damaged for a file that is not, also for one
/// that is no help index at all; ExitCode::failure, with a report, for one that cannot be read.
ExitCode check(const std::string& path, std::string& output, Report& report);

}  // namespace bvmake
