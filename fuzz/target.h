// What the fuzz targets have in common.
//
// A target is a program that tries one input after another: made by libFuzzer where the build asks
// for it, or else those of its corpus, as an ordinary test. What it tries has to hold for every
// input, so each target says what that is and does not only look for crashes.
#pragma once

#include <string>

namespace fuzz {

// Tries one input. Each target defines it.
void Try(const std::string& input);

// Called once, when no input was tried yet and no thread started. A target may define it.
__attribute__((weak)) void Prepare();

// Ends the program, with a line about it, when what must hold does not.
void Require(bool holds, const char* property);

}  // namespace fuzz
