// Leaving requests in the work queue, as every writer of it must.
#pragma once

#include <json/value.h>

#include <string>
#include <vector>

namespace tool {

// A request of the queue: what the library's ProcessQueue reads in one line. `path` is left out
// when it is empty.
Json::Value QueueRequest(int op, const std::string& path);

// Appends the requests, a line each, in one write, and returns when they are on disk. Waits while
// another process holds the queue's lock; one that was moved aside meanwhile is let go, and the new
// one taken. What a writer that crashed left unfinished at the end is ended first.
//
// Throws Failure when the queue cannot be opened, locked or written, and leaves no part of a line
// then. When all was written but the queue's directory cannot be synced, the lines stay and it
// throws too: they are there, but may not outlast a power cut.
void AppendToQueue(const std::vector<Json::Value>& requests);

}  // namespace tool
