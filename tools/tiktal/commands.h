// The subcommands. Each prints its result on standard output and throws UsageError or StatusError.
#pragma once

#include <string>

namespace cli {

struct Options {
    std::string resource;
    std::string attribute;
    std::string value;
    std::string item;  // time-reference name; "" when --item is absent
    bool hasItem = false;
    std::string type;  // --type, or ""
    std::string code;  // status code of `status`
    bool reset = false;
    bool json = false;
    // route and unroute
    std::string source;
    std::string destination;
    bool clock = false;
    bool invert = false;
    std::string syncClock;  // --sync-clock, or "" (the default synchronization)
};

void openCommand(const Options& options);
void getCommand(const Options& options);
void setCommand(const Options& options);
void refsCommand(const Options& options);
void timeCommand(const Options& options);
void persistCommand(const Options& options);
void statusCommand(const Options& options);

// Local devices (local_commands.cpp).
void devicesCommand(const Options& options);
void routeCommand(const Options& options);
void unrouteCommand(const Options& options);
void resetCommand(const Options& options);

}  // namespace cli
