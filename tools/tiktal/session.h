// A session of the C interface that is closed however the command ends.
#pragma once

#include <string>

#include <tiktal/tiktal.h>

#include "errors.h"

namespace cli {

class Session {
public:
    Session(const std::string& resource, bool reset) {
        check("tiktal_init", tiktal_init(resource.c_str(), VI_FALSE, reset ? VI_TRUE : VI_FALSE, &vi_));
        open_ = true;
    }
    // On a failure elsewhere the session is closed here; the failure is the one reported.
    ~Session() {
        if (open_) tiktal_close(vi_);
    }
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;

    // Closes on success, so that a failing close is reported too.
    void close() {
        open_ = false;
        check("tiktal_close", tiktal_close(vi_));
    }
    ViSession vi() const { return vi_; }

private:
    ViSession vi_ = 0;
    bool open_ = false;
};

}  // namespace cli
