// The test controls under /_sim: they queue directives, read the counters and the last request,
// and read or change the state. None of them counts as a served request.
#pragma once

#include "simulator.h"

#include <httplib.h>

#include <string>

namespace timeservice {

// Answers one request under /_sim; 404 for an unknown control.
void control(Simulator& sim, const httplib::Request& req, httplib::Response& res);

// Answers with `status` and {"error":text}, as the controls refuse a request.
void refuse(httplib::Response& res, int status, const std::string& text);

}  // namespace timeservice
