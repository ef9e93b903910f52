// What the backends share: pieces written over the platform layer's own functions.
#pragma once

#include <chrono>
#include <string>
#include <vector>

namespace platform {

// The names in a folder, sorted, without "." and ".."; 0 or the error number.
int listFolder(const std::string& path, std::vector<std::string>& names);

// Removes the file at `path`; false when it could not.
bool removeFile(const std::string& path) noexcept;

// Removes the temporary files that writers of `name` in `folder` left when they were killed before
// their rename ("." + name + "." and six characters, as File::replace makes them). Only a writer
// that holds the file's lock makes one, so while the lock is held every such file is a leftover.
void removeLeftovers(const std::string& folder, const std::string& name);

// A pause between two tries of a waiter for a file's lock: 0.5 to 1.5 ms, drawn anew each time so
// that no waiter keeps a turn that always comes just after the lock is taken again.
std::chrono::microseconds nextLockPause() noexcept;

}  // namespace platform
