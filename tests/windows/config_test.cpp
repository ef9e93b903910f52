// The configuration file and simulated devices under Wine: "tiktal.config" and the ".fake" files in
// C:\ProgramData\Korvane\tiktal of the Wine prefix. Two processes rewrite the file at once while
// adding devices; one of them is ended by TerminateProcess on the way, and nothing is lost.
// This program is also its own writer process: win_config_test writer NAME BUS COUNT.
#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#include <windows.h>
#include <shlobj.h>

#include <cjson/cJSON.h>
#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <cstdio>
#include <fstream>
#include <memory>
#include <set>
#include <sstream>
#include <string>

#include "stderr_capture.h"

namespace {

std::string dataDirectory() {
    char folder[MAX_PATH];
    EXPECT_EQ(SHGetFolderPathA(nullptr, CSIDL_COMMON_APPDATA, nullptr, SHGFP_TYPE_CURRENT, folder), S_OK);
    return std::string(folder) + "\\Korvane\\tiktal";
}

// NAME.fake at PCI address BUS:DEVICE.FUNCTION, written whole under another name and renamed, so
// that a process building its device list meanwhile never reads a part of it.
void writeFake(const std::string& name, int bus, int device, int function) {
    const std::string path = dataDirectory() + "\\" + name + ".fake", staged = path + ".tmp";
    std::ofstream(staged) << R"({"serialNumber":"5eed","pciDeviceID":29701,"pciSubsystemID":1,"pciRevision":2,)"
                          << R"("pciBusNumber":)" << bus << R"(,"pciDeviceNumber":)" << device
                          << R"(,"pciFunctionNumber":)" << function
                          << R"(,"pcieLinkWidth":4,"pcieMaxLinkWidth":4,"pcieTransferRate":2,"pcieMaxTransferRate":2})";
    MoveFileExA(staged.c_str(), path.c_str(), MOVEFILE_REPLACE_EXISTING);
}

std::string pxiName(int bus, int device) { return "PXI0::" + std::to_string(bus) + "-" + std::to_string(device) + ".0::INSTR"; }

using Json = std::unique_ptr<cJSON, decltype(&cJSON_Delete)>;

// The configuration file as JSON; null when it is not whole JSON.
Json readConfiguration(std::string& text) {
    std::ifstream file(dataDirectory() + "\\tiktal.config", std::ios::binary);
    std::stringstream content;
    content << file.rdbuf();
    text = content.str();
    return Json(cJSON_Parse(text.c_str()), cJSON_Delete);
}

// The device members of the file by token, with their aliases.
std::set<std::string> tokensIn(const cJSON* configuration) {
    std::set<std::string> tokens;
    const cJSON* device = nullptr;
    cJSON_ArrayForEach(device, cJSON_GetObjectItemCaseSensitive(configuration, "devices")) tokens.insert(device->string);
    return tokens;
}

// Adds COUNT simulated devices one by one, each opened by its address, which rebuilds the device
// list and so rewrites the file; reports "opened N" on standard output after each.
int writer(const std::string& name, int bus, int count) {
    for (int i = 0; i < count; ++i) {
        writeFake(name + std::to_string(i), bus, i, 0);
        ViSession vi = 0;
        const ViStatus status = tiktal_init(pxiName(bus, i).c_str(), VI_FALSE, VI_FALSE, &vi);
        if (status != VI_SUCCESS) {
            std::printf("failed 0x%08lX\n", static_cast<unsigned long>(status));
            return 1;
        }
        tiktal_close(vi);
        std::printf("opened %d\n", i + 1);
        std::fflush(stdout);
    }
    return 0;
}

// A writer process whose standard output this process reads.
struct Writer {
    PROCESS_INFORMATION process{};
    HANDLE output = nullptr;
    int opened = 0;

    Writer(const std::string& name, int bus, int count) {
        SECURITY_ATTRIBUTES inherit{sizeof inherit, nullptr, TRUE};
        HANDLE write = nullptr;
        EXPECT_TRUE(CreatePipe(&output, &write, &inherit, 0));
        SetHandleInformation(output, HANDLE_FLAG_INHERIT, 0);
        STARTUPINFOA startup{};
        startup.cb = sizeof startup;
        startup.dwFlags = STARTF_USESTDHANDLES;
        startup.hStdOutput = write;
        startup.hStdError = GetStdHandle(STD_ERROR_HANDLE);
        char program[MAX_PATH];
        GetModuleFileNameA(nullptr, program, MAX_PATH);
        std::string line = std::string("\"") + program + "\" writer " + name + " " + std::to_string(bus) + " " +
                           std::to_string(count);
        EXPECT_TRUE(CreateProcessA(nullptr, line.data(), nullptr, nullptr, TRUE, 0, nullptr, nullptr, &startup, &process));
        CloseHandle(write);
    }
    ~Writer() {
        CloseHandle(output);
        CloseHandle(process.hThread);
        CloseHandle(process.hProcess);
    }
    // Reads its reports until it has opened `atLeast` devices or its output ends.
    void readUntil(int atLeast) {
        std::string pending;
        char buffer[64];
        DWORD got = 0;
        while (opened < atLeast && ReadFile(output, buffer, sizeof buffer - 1, &got, nullptr) && got > 0) {
            pending.append(buffer, got);
            for (std::size_t end; (end = pending.find('\n')) != std::string::npos; pending.erase(0, end + 1))
                if (std::sscanf(pending.c_str(), "opened %d", &opened) != 1) ADD_FAILURE() << pending.substr(0, end);
        }
    }
    DWORD exitCode() {
        WaitForSingleObject(process.hProcess, 120000);
        DWORD code = ~0u;
        GetExitCodeProcess(process.hProcess, &code);
        return code;
    }
};

class Configuration : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        std::string folder = dataDirectory();
        for (std::size_t at = folder.find('\\', 3); at != std::string::npos; at = folder.find('\\', at + 1))
            CreateDirectoryA(folder.substr(0, at).c_str(), nullptr);
        CreateDirectoryA(folder.c_str(), nullptr);
        DeleteFileA((folder + "\\tiktal.config").c_str());
    }
};

TEST_F(Configuration, SimulatedDevicesOpenByAliasAndAddressAndTraceTheirCalls) {
    writeFake("board1", 254, 3, 1);
    writeFake("board2", 255, 0, 0);
    std::ofstream(dataDirectory() + "\\board3.fake.bak") << "{}";  // not a simulated device
    std::ofstream(dataDirectory() + "\\board4.FAKE") << "{}";
    testsupport::StderrCapture trace;
    for (const char* name : {"Sync1", "sYNC2", "PXI0::254-3.1::INSTR", "PXI254::3::1::INSTR", "PXI0::255-0.0::INSTR"}) {
        ViSession vi = 0;
        EXPECT_EQ(tiktal_init(name, VI_FALSE, VI_FALSE, &vi), VI_SUCCESS) << name;
        EXPECT_EQ(tiktal_ConnectClkTerminals(vi, "ClkIn", "PXI_Clk10"), VI_SUCCESS) << name;
        EXPECT_EQ(tiktal_close(vi), VI_SUCCESS) << name;
    }
    for (const char* name : {"Sync3", "PXI0::254-3.0::INSTR", "board3"}) {
        ViSession vi = 99;
        EXPECT_EQ(tiktal_init(name, VI_FALSE, VI_FALSE, &vi), tiktalerr_deviceNotFound) << name;
    }
    std::string lines;
    for (const std::string& line : trace.finish()) lines += line;
    EXPECT_NE(lines.find("{ tiktal::SessionDebugPrintOnly::connectClkTerminals"), std::string::npos) << lines;

    std::string text;
    const Json configuration = readConfiguration(text);
    ASSERT_TRUE(configuration) << text;
    EXPECT_EQ(tokensIn(configuration.get()), (std::set<std::string>{"FAKE:TIKTAL:board1", "FAKE:TIKTAL:board2"}));
    const cJSON* board2 = cJSON_GetObjectItemCaseSensitive(cJSON_GetObjectItemCaseSensitive(configuration.get(), "devices"),
                                                           "FAKE:TIKTAL:board2");
    EXPECT_STREQ(cJSON_GetStringValue(cJSON_GetObjectItemCaseSensitive(board2, "alias")), "Sync2");
}

TEST_F(Configuration, TwoProcessesRewriteTheFileAndOneEndedOnTheWayLosesNothing) {
    constexpr int kDevices = 24;
    Writer steady("steady", 101, kDevices), ended("ended", 102, kDevices);
    ended.readUntil(kDevices / 3);
    ASSERT_TRUE(TerminateProcess(ended.process.hProcess, 9));
    EXPECT_EQ(ended.exitCode(), 9u);
    steady.readUntil(kDevices);
    EXPECT_EQ(steady.exitCode(), 0u);
    EXPECT_EQ(steady.opened, kDevices);

    // Every device a process opened is in the file, which is whole JSON.
    std::string text;
    const Json configuration = readConfiguration(text);
    ASSERT_TRUE(configuration) << text;
    const std::set<std::string> tokens = tokensIn(configuration.get());
    for (const auto* writer : {&steady, &ended}) {
        const std::string name = writer == &steady ? "steady" : "ended";
        for (int i = 0; i < writer->opened; ++i)
            EXPECT_EQ(tokens.count("FAKE:TIKTAL:" + name + std::to_string(i)), 1u) << name << i << '\n' << text;
    }
    EXPECT_GE(ended.opened, kDevices / 3);

    // The next writer clears what the ended one may have left; every device opens.
    ViSession vi = 0;
    EXPECT_EQ(tiktal_init(pxiName(102, 0).c_str(), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    tiktal_close(vi);
    WIN32_FIND_DATAA found;
    const HANDLE search = FindFirstFileA((dataDirectory() + "\\.tiktal.config.*").c_str(), &found);
    EXPECT_EQ(search, INVALID_HANDLE_VALUE) << "left over: " << found.cFileName;
    if (search != INVALID_HANDLE_VALUE) FindClose(search);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc == 5 && std::string(argv[1]) == "writer") return writer(argv[2], std::atoi(argv[3]), std::atoi(argv[4]));
    ::testing::InitGoogleTest(&argc, argv);
    return RUN_ALL_TESTS();
}
