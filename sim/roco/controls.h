// The test controls: the log of calls (in memory, and in the file ZRROCOAPI_SIM_LOG names), and
// the extra entry points zrrocoapi_sim_log, zrrocoapi_sim_routes and zrrocoapi_sim_reset.
#pragma once

namespace rocosim {

// Appends one call's JSON object to the log and, when ZRROCOAPI_SIM_LOG is set, as one line to
// that file. The caller holds serviceLock().
void appendToLog(const char* entry) noexcept;

}  // namespace rocosim
