// Telling beforehand what the library would stumble over.
#pragma once

#include <string>

namespace tool {

// Why a request with this path fails, or does nothing although it means to do something: the
// library's own steps up to the point where something would be sent. Empty when nothing is wrong.
// `op` is a number of the queue's.
std::string ProblemOf(int op, const std::string& conf_path);

// "PATH: PROBLEM" of the first application on this device that has one; empty when none has.
std::string FirstProblem();

}  // namespace tool
