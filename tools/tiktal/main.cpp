// tiktal: a command-line front end over the C interface of libtiktal.
//
// Exit status: 0 success, 1 a call of the library returned a status other than 0, 2 a usage error.
#include <CLI/CLI.hpp>

#include <exception>
#include <functional>
#include <iostream>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "commands.h"
#include "errors.h"
#include "output.h"

namespace {

using cli::Options;

constexpr int kFailedCall = 1;
constexpr int kUsage = 2;

const std::string kExitStatus =
    "Exit status: 0 success; 1 a library call returned a status other than 0, printed on stderr as\n"
    "\"tiktal: FUNCTION: 0xSTATUS MESSAGE\"; 2 a usage error (nothing was sent).";

const std::string kAttributeForms =
    "ATTRIBUTE is the constant name (TIKTAL_ATTR_1588_PRIORITY1), the name without TIKTAL_ATTR_\n"
    "(1588_PRIORITY1), the end of exactly one name after a \"_\" (GM_IP_ADDRESS), in any case, or a\n"
    "number (1150732, 0x118F0C); a number the command does not know needs --type. Attributes of a\n"
    "time reference need --item NAME.\n\n";

CLI::App* addCommand(CLI::App& app, Options& options, const char* name, const char* description) {
    CLI::App* command = app.add_subcommand(name, description);
    command->add_flag("--json", options.json, "Print the result as JSON; failures as a JSON object on stderr");
    return command;
}

void addResource(CLI::App* command, Options& options) {
    command->add_option("RESOURCE", options.resource,
                        "SyncTestInternal___, sync://HOST[:PORT]/DEVICE, a local device's alias or PXI resource name")
        ->required();
}

void addAttribute(CLI::App* command, Options& options) {
    command->add_option("ATTRIBUTE", options.attribute, "Attribute: name, short name or number (see below)")->required();
    command->footer(kAttributeForms + kExitStatus);
}

void addItemAndType(CLI::App* command, Options& options) {
    command->add_option("--item", options.item, "Time reference of the attribute (passed as terminalName)");
    command->add_option("--type", options.type, "Value type, in place of the attribute's own")
        ->check(CLI::IsMember({"string", "int32", "real64", "boolean"}, CLI::ignore_case));
}

std::string failureMessage(const CLI::App*, const CLI::Error& error) {
    return std::string("tiktal: ") + error.what() + "\nRun with --help for more information.\n";
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    CLI::App app("Opens sessions of the tiktal driver library and calls it through its C interface.", "tiktal");
    app.require_subcommand(1);
    app.failure_message(failureMessage);
    app.footer(kExitStatus);

    std::vector<std::pair<CLI::App*, std::function<void(const Options&)>>> commands;
    CLI::App* open = addCommand(app, options, "open", "Open a session, run its self test, close it");
    addResource(open, options);
    open->add_flag("--reset", options.reset, "Reset the device when opening");
    commands.emplace_back(open, cli::openCommand);

    CLI::App* get = addCommand(app, options, "get", "Read an attribute");
    addResource(get, options);
    addAttribute(get, options);
    addItemAndType(get, options);
    commands.emplace_back(get, cli::getCommand);

    CLI::App* set = addCommand(app, options, "set", "Write an attribute");
    addResource(set, options);
    addAttribute(set, options);
    set->add_option("VALUE", options.value, "Decimal Int32, Real64, Boolean (true/false, 1/0, yes/no, on/off) or text")
        ->required();
    addItemAndType(set, options);
    commands.emplace_back(set, cli::setCommand);

    // The subcommands that take nothing but the resource.
    const std::tuple<const char*, const char*, void (*)(const Options&)> resourceOnly[] = {
        {"refs", "List the time references with their state", cli::refsCommand},
        {"time", "Read the current time (seconds since the Unix epoch)", cli::timeCommand},
        {"persist", "Make the device store its configuration", cli::persistCommand},
    };
    for (const auto& [name, description, run] : resourceOnly) {
        CLI::App* command = addCommand(app, options, name, description);
        addResource(command, options);
        commands.emplace_back(command, run);
    }

    CLI::App* devices = addCommand(app, options, "devices", "List the local devices: alias, presence, PCI and PXI location");
    commands.emplace_back(devices, cli::devicesCommand);

    using Run = void (*)(const Options&);
    const std::tuple<const char*, const char*, Run> routing[] = {
        {"route", "Connect two terminals of a timing module (for as long as the session lasts)", cli::routeCommand},
        {"unroute", "Disconnect two terminals of a timing module (AllConnected: every route at that end)",
         cli::unrouteCommand},
    };
    for (const auto& [name, description, run] : routing) {
        CLI::App* command = addCommand(app, options, name, description);
        command->add_option("DEVICE", options.resource, "Alias or PXI resource name of the module")->required();
        command->add_option("SRC", options.source, "Source terminal (PFI0, ClkIn, ...)")->required();
        command->add_option("DEST", options.destination, "Destination terminal (PXI_Trig0, PXI_Clk10, ...)")->required();
        command->add_flag("--clock", options.clock, "A clock route instead of a trigger route");
        if (run == cli::routeCommand) {
            command->add_flag("--invert", options.invert, "Invert the trigger");
            command->add_option("--sync-clock", options.syncClock, "Synchronization clock (\"\" or SyncClkAsync)");
        }
        commands.emplace_back(command, run);
    }

    CLI::App* reset = addCommand(app, options, "reset", "Reset a device");
    reset->add_option("DEVICE", options.resource, "Alias or PXI resource name")->required();
    commands.emplace_back(reset, cli::resetCommand);

    CLI::App* status = addCommand(app, options, "status", "Explain a status code");
    status->add_option("CODE", options.code, "Status in hex (0xBFFA4003) or decimal, signed or unsigned")->required();
    commands.emplace_back(status, cli::statusCommand);

    // CLI11 would only say that a subcommand is required.
    const auto known = [&](const char* name) {
        for (const auto& entry : commands)
            if (entry.first->check_name(name)) return true;
        return false;
    };
    if (argc > 1 && argv[1][0] != '-' && !known(argv[1])) {
        std::cerr << "tiktal: unknown subcommand \"" << argv[1] << "\"\nRun with --help for more information.\n";
        return kUsage;
    }
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? 0 : kUsage;
    }
    for (CLI::App* command : {get, set})
        options.hasItem = options.hasItem || command->count("--item") > 0;
    try {
        for (const auto& [command, run] : commands)
            if (command->parsed()) run(options);
    } catch (const cli::UsageError& error) {
        std::cerr << "tiktal: " << error.what() << std::endl;
        return kUsage;
    } catch (const cli::StatusError& error) {
        cli::reportStatusError(error.function, error.status, options.json);
        return kFailedCall;
    } catch (const std::exception& error) {  // out of memory, or output that cannot be written
        std::cerr << "tiktal: " << error.what() << std::endl;
        return kFailedCall;
    }
    return 0;
}
