// Runs the simulated-machine command (tools/machine/tiktal-machine, whose path the test program
// gets as TIKTAL_MACHINE) from a test; its output is discarded and a failure fails the test.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

namespace tiktaltest {

inline void runMachineCommand(const std::string& arguments) {
    const std::string command = std::string(TIKTAL_MACHINE) + " " + arguments + " > /dev/null";
    ASSERT_EQ(std::system(command.c_str()), 0) << command;
}

}  // namespace tiktaltest
