// What the backends share: pieces written over the platform layer's own functions.
#pragma once

#include <algorithm>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "platform/platform.h"

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

// Takes a file's lock in turn with other waiters, waiting at most `limit`. `tryLock()` takes it
// without waiting and fails with `busy` while another holds it; `joinLine(true)` and
// `joinLine(false)` join and leave the line of waiters (failing to join only means that later
// comers do not see this one). While `othersWait`, a newcomer does not try at once but waits in
// line with them, each try after a pause of chance length. error::kTimedOut in the end.
template <class TryLock, class JoinLine>
OsError lockInTurn(std::chrono::milliseconds limit, OsError busy, bool othersWait, TryLock tryLock,
                   JoinLine joinLine) noexcept {
    using Clock = std::chrono::steady_clock;
    const Clock::time_point deadline = Clock::now() + limit;
    OsError error = othersWait ? busy : tryLock();
    if (error.code != busy.code) return error;
    joinLine(true);
    for (Clock::time_point now = Clock::now(); error.code == busy.code && now < deadline; now = Clock::now()) {
        std::this_thread::sleep_for(std::min<Clock::duration>(nextLockPause(), deadline - now));
        error = tryLock();
    }
    joinLine(false);
    if (error.code == busy.code) error.code = error::kTimedOut;
    return error;
}

}  // namespace platform
