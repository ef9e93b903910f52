// Simulated machines for the benchmarks: timing modules in slots 1 to 30 of PXI chassis 2, 4, 6
// and so on (chassis N takes PCI buses N and N+1, so chassis two apart share no bus), laid out by
// the project's machine command in one temporary folder that is removed when the program ends.
#pragma once

#include <stdlib.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <initializer_list>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace benchsupport {

inline constexpr int kSlotsPerChassis = 30;

// The alias of the last module of a machine of `modules` modules (its chassis and slot).
inline std::string lastAlias(int modules) {
    const int index = modules - 1;
    return "PXI" + std::to_string(2 + 2 * (index / kSlotsPerChassis)) + "Slot" + std::to_string(1 + index % kSlotsPerChassis);
}

inline std::string layout(int modules) {
    const auto joined = [](const std::string& list, const std::string& item) { return list.empty() ? item : list + "," + item; };
    std::string chassis;
    for (int placed = 0, number = 2; placed < modules; number += 2) {
        std::string slots;
        for (int slot = 1; slot <= kSlotsPerChassis && placed < modules; ++slot, ++placed)
            slots = joined(slots, "\"" + std::to_string(slot) + "\":{}");
        chassis = joined(chassis, "{\"number\":" + std::to_string(number) + ",\"slots\":{" + slots + "}}");
    }
    return "{\"chassis\":[" + chassis + "]}";
}

// A machine of each size, all laid out on first use.
class Machines {
public:
    template <std::size_t N>
    explicit Machines(const int (&sizes)[N]) : _sizes(sizes, sizes + N) {}
    ~Machines() {
        std::error_code ignored;
        if (!_base.empty()) std::filesystem::remove_all(_base, ignored);
    }

    // Points TIKTAL_SYSROOT at the machine of `modules` modules; returns its folder.
    std::string use(int modules) {
        if (_base.empty()) layOutAll();
        const std::string root = (_base / std::to_string(modules)).string();
        ::setenv("TIKTAL_SYSROOT", root.c_str(), 1);
        return root;
    }

    // The folder that holds the machines (laid out first when needed).
    std::string base() {
        if (_base.empty()) layOutAll();
        return _base.string();
    }

private:
    // The chassis query library trusts the times of its inventory file only once they are some
    // seconds old (a file just written may change again within the same tick of the clock), and
    // reads it again until then: the machines wait for that, as those in use are older.
    void layOutAll() {
        std::string pattern = (std::filesystem::temp_directory_path() / "tiktal-bench-XXXXXX").string();
        if (!::mkdtemp(pattern.data())) throw std::runtime_error("mkdtemp failed");
        _base = pattern;
        for (const int modules : _sizes) {
            const std::string command = std::string(TIKTAL_MACHINE) + " create " + (_base / std::to_string(modules)).string() +
                                        " '" + layout(modules) + "'";
            if (std::system(command.c_str()) != 0) throw std::runtime_error("tiktal-machine failed: " + command);
        }
        std::this_thread::sleep_for(std::chrono::seconds(3));
    }

    std::vector<int> _sizes;
    std::filesystem::path _base;
};

}  // namespace benchsupport
