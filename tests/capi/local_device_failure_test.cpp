// Local devices whose driver or services misbehave, and an application that calls the library
// from a destructor while its own exception unwinds.
#include <cjson/cJSON.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <tiktal/tiktal.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <functional>
#include <sstream>
#include <stdexcept>
#include <vector>

#include "local_machine.h"
#include "stderr_capture.h"

namespace {

constexpr std::uint32_t kReadTerminalValue = 0x80012008;
constexpr ViAttr kTerminal58 = 1150100;

class LocalDeviceFailures : public ::testing::Test, protected localmachine::LocalMachine {};

// Connections to `path` that no one accepts, until the listener's backlog is full.
std::vector<int> fillBacklog(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
    std::vector<int> sockets;
    for (;;) {
        const int s = ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_NONBLOCK, 0);
        if (::connect(s, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
            EXPECT_EQ(errno, EAGAIN);
            ::close(s);
            return sockets;
        }
        sockets.push_back(s);
    }
}

TEST_F(LocalDeviceFailures, ADriverThatAcceptsNothingTimesTheOpenOut) {
    const std::vector<int> waiting = fillBacklog(slot4->path());
    ::kill(slot4->pid(), SIGSTOP);
    ViSession vi = 0;
    EXPECT_EQ(tiktal_init(const_cast<ViRsrc>("PXI1Slot4"), VI_FALSE, VI_FALSE, &vi), static_cast<ViStatus>(0xBFFA400B));
    ::kill(slot4->pid(), SIGCONT);
    for (const int s : waiting) ::close(s);
}

TEST_F(LocalDeviceFailures, AReadLockHeldByAnyoneTimesTheOpenOutNamingTheFile) {
    const std::string path = dataDirectory() + "/tiktal.config";
    const int reader = ::open(path.c_str(), O_RDWR | O_CREAT, 0644);
    struct flock shared {};
    shared.l_type = F_RDLCK;
    ASSERT_EQ(::fcntl(reader, F_OFD_SETLK, &shared), 0);
    testsupport::StderrCapture trace;
    ViSession vi = 0;
    EXPECT_EQ(tiktal_init(const_cast<ViRsrc>("PXI1Slot2"), VI_FALSE, VI_FALSE, &vi), static_cast<ViStatus>(0xBFFA400B));
    std::string lines;
    for (const std::string& write : trace.finish()) lines += write;
    EXPECT_NE(lines.find("Fatal configuration error! "), std::string::npos) << lines;
    EXPECT_NE(lines.find(path), std::string::npos) << lines;
    ::close(reader);
}

TEST_F(LocalDeviceFailures, APendingAnswerIsAnInternalErrorAndNothingOfItIsUsed) {
    ViSession vi = 0;
    ASSERT_EQ(tiktal_init(const_cast<ViRsrc>("PXI1Slot2"), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    ASSERT_EQ(tiktal_SetAttributeViReal64(vi, "", kTerminal58, 2.5), VI_SUCCESS);
    for (const int pending : {EAGAIN, EINPROGRESS}) {
        slot2->failSystemCall(kReadTerminalValue, pending, 1, true);
        ViReal64 value = -1;
        EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", kTerminal58, &value), -52008) << pending;
        EXPECT_NE(value, 2.5) << pending;
    }
    ViReal64 value = 0;
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", kTerminal58, &value), VI_SUCCESS) << "the connection stays";
    EXPECT_EQ(value, 2.5);
    tiktal_close(vi);
}

// Runs `calls` in a destructor while an exception of the application unwinds.
void whileUnwinding(const std::function<void()>& calls) {
    struct Caller {
        const std::function<void()>& calls;
        ~Caller() { calls(); }
    };
    try {
        Caller caller{calls};
        throw std::runtime_error("the application's own failure");
    } catch (const std::runtime_error&) {
    }
}

TEST_F(LocalDeviceFailures, FailuresOfTheServicesCountInADestructorDuringUnwinding) {
    machine("fake " + _root + " board1");  // at a PCI address no chassis slot has
    ViStatus opened = 1, first = 1, refused = 0;
    ViSession vi = 0;
    whileUnwinding([&] {
        opened = tiktal_init(const_cast<ViRsrc>("PXI1Slot4"), VI_FALSE, VI_FALSE, &vi);
        first = tiktal_ConnectTrigTerminals(vi, "PFI0", "PXI_Trig3", "", 0, 0);
        refused = tiktal_ConnectTrigTerminals(vi, "PFI1", "PXI_Trig3", "", 0, 0);
        tiktal_close(vi);
    });
    EXPECT_EQ(opened, VI_SUCCESS);
    EXPECT_EQ(first, VI_SUCCESS);
    EXPECT_EQ(refused, static_cast<ViStatus>(0xBFFF0042)) << "the destination is driven by another source";

    std::stringstream text;
    text << std::ifstream(dataDirectory() + "/tiktal.config").rdbuf();
    cJSON* file = cJSON_Parse(text.str().c_str());
    const cJSON* board = cJSON_GetObjectItem(cJSON_GetObjectItem(file, "devices"), "FAKE:TIKTAL:board1");
    ASSERT_NE(board, nullptr) << text.str();
    EXPECT_EQ(cJSON_GetObjectItem(board, "pxi_chassis_number")->valuedouble, -1) << "unknown, not made up";
    EXPECT_EQ(cJSON_GetObjectItem(board, "pxi_slot_number")->valuedouble, -1);
    cJSON_Delete(file);
}

}  // namespace
