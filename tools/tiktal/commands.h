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
};

void openCommand(const Options& options);
void getCommand(const Options& options);
void setCommand(const Options& options);
void refsCommand(const Options& options);
void timeCommand(const Options& options);
void persistCommand(const Options& options);
void statusCommand(const Options& options);

}  // namespace cli
