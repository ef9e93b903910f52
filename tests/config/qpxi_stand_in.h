// Helpers of the tests of the PXI chassis query library: a simulated machine in a temporary folder
// with its chassis inventory file, and the stand-in's test entries (the copy of libzrqpxi.so that
// the library loaded, found again by its bare name).
#pragma once

#include <dlfcn.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include "zrqpxi_sim.h"

namespace qpxi_test {

// A temporary TIKTAL_SYSROOT, removed (and the variable unset) at the end.
class Sysroot {
public:
    Sysroot() {
        std::string pattern = (std::filesystem::temp_directory_path() / "tiktal-qpxi-XXXXXX").string();
        if (!mkdtemp(pattern.data())) throw std::runtime_error("mkdtemp failed");
        _root = pattern;
        std::filesystem::create_directories(_root / "etc/tiktal");
        setenv("TIKTAL_SYSROOT", _root.c_str(), 1);
    }
    ~Sysroot() {
        unsetenv("TIKTAL_SYSROOT");
        std::error_code ignored;
        std::filesystem::remove_all(_root, ignored);
    }
    Sysroot(const Sysroot&) = delete;
    Sysroot& operator=(const Sysroot&) = delete;

    std::filesystem::path inventory() const { return _root / "etc/tiktal/chassis.json"; }
    void writeInventory(const std::string& text) const {
        std::ofstream(inventory(), std::ios::binary | std::ios::trunc) << text;
    }

private:
    std::filesystem::path _root;
};

// The stand-in's test entries.
class StandIn {
public:
    StandIn() : _library(dlopen("libzrqpxi.so", RTLD_NOW | RTLD_LOCAL)) {
        if (!_library) throw std::runtime_error(dlerror());
    }
    ~StandIn() { dlclose(_library); }
    StandIn(const StandIn&) = delete;
    StandIn& operator=(const StandIn&) = delete;

    std::uint32_t openItems() const { return entry<zrqpxi_sim_openItems_fn>("zrqpxi_sim_openItems")(); }
    std::uint32_t openContainers() const {
        return entry<zrqpxi_sim_openContainers_fn>("zrqpxi_sim_openContainers")();
    }
    std::string log() const {
        const auto read = entry<zrqpxi_sim_log_fn>("zrqpxi_sim_log");
        std::string text(read(nullptr, 0), '\0');
        read(text.data(), static_cast<std::uint32_t>(text.size()));
        text.pop_back();  // the NUL
        return text;
    }
    void invalidate() const { entry<zrqpxi_sim_invalidate_fn>("zrqpxi_sim_invalidate")(); }
    void reset() const { entry<zrqpxi_sim_reset_fn>("zrqpxi_sim_reset")(); }

private:
    template <class Fn>
    Fn entry(const char* name) const {
        void* found = dlsym(_library, name);
        if (!found) throw std::runtime_error(std::string("no ") + name);
        return reinterpret_cast<Fn>(found);
    }

    void* _library;
};

// Two chassis: 1 with four slots (two devices in slot 2, none in slot 3) and two trigger
// bridges, and 7 with one slot; the second chassis has no model.
inline const char* const kTwoChassis = R"({
  "chassis": [
    {"number": 1, "model": "Chassis-18",
     "slots": [{"number": 1, "devices": [{"bus": 2, "device": 0, "function": 0}]},
               {"number": 2, "devices": [{"bus": 3, "device": 0, "function": 0},
                                         {"bus": 3, "device": 0, "function": 1}]},
               {"number": 3},
               {"number": 4, "devices": [{"bus": 255, "device": 31, "function": 7}]}],
     "triggerBridges": [{"number": 1}, {"number": 2}]},
    {"number": 7, "slots": [{"number": 10, "devices": [{"bus": 9, "device": 4, "function": 2}]}]}
  ]
})";

}  // namespace qpxi_test
