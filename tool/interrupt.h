// What happens when the user or the system ends the program in the middle of its work.
#pragma once

namespace tool {

// From now on SIGINT, SIGTERM and SIGHUP, where they are not ignored, write `line` to standard
// error, which says in which state things are left, and then end the program as they do by default.
// `line` is used as it stands and must stay valid.
void SayWhenInterrupted(const char* line);

// Whether the cursor stands behind a line that is not ended: the message then begins a new one.
void SetLineOpen(bool open);

}  // namespace tool
