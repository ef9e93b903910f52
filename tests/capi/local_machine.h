// A simulated machine for the C-interface tests of local devices, with its stand-ins running: the
// machine command lays out the modules, a driver stand-in serves each module's interface path, and
// the routing service and the PXI chassis query are the stand-in libraries (found by
// LD_LIBRARY_PATH, loaded here too so that the tests read their logs).
//
// Chassis 1 holds modules in slots 2 (serial 1a2b, alias PXI1Slot2, bus 2 device 2) and 4
// (0x7406), chassis 3 a module of another kind (0x7407) in slot 5. Daemons serve the modules of
// chassis 1.
#pragma once

#include <dlfcn.h>
#include <stdlib.h>

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>
#include <string>

#include "child_process.h"
#include "device_daemon.h"
#include "machine_command.h"

namespace localmachine {

// A stand-in library loaded by its bare name, which the driver's own load then shares.
class StandIn {
public:
    explicit StandIn(const char* name) : _library(dlopen(name, RTLD_NOW | RTLD_LOCAL)) {}
    ~StandIn() {
        if (_library) dlclose(_library);
    }
    StandIn(const StandIn&) = delete;
    StandIn& operator=(const StandIn&) = delete;
    template <class Fn>
    Fn entry(const char* name) const {
        return reinterpret_cast<Fn>(_library ? dlsym(_library, name) : nullptr);
    }

private:
    void* _library;
};

class LocalMachine {
public:
    LocalMachine() : _root(tiktaltest::makeTemporaryFolder("tiktal-local")) {
        ::setenv("TIKTAL_SYSROOT", _root.c_str(), 1);
        machine("create " + _root +
                R"( '{"chassis":[{"number":1,"slots":{"2":{"serial":"1a2b"},"4":{"device":"0x7406"}}},)"
                R"({"number":3,"slots":{"5":{"device":"0x7407"}}}]}')");
        slot2 = std::make_unique<DeviceDaemon>(_root + "/dev/tiktal0");
        slot4 = std::make_unique<DeviceDaemon>(_root + "/dev/tiktal1");
    }
    ~LocalMachine() {
        slot2.reset();
        slot4.reset();
        ::unsetenv("TIKTAL_SYSROOT");
        tiktaltest::removeFolder(_root);
    }
    LocalMachine(const LocalMachine&) = delete;
    LocalMachine& operator=(const LocalMachine&) = delete;

    // Runs the machine command on this machine; its output is discarded.
    void machine(const std::string& arguments) { tiktaltest::runMachineCommand(arguments); }
    std::string dataDirectory() const { return _root + "/var/lib/Korvane/tiktal"; }

    std::string _root;
    StandIn routing{"libzrrocoapi.so"};
    StandIn chassis{"libzrqpxi.so"};
    std::unique_ptr<DeviceDaemon> slot2, slot4;
};

}  // namespace localmachine
