// Loading the run-time libraries of time-service sessions from the shared directory that the
// registry value ZRSHAREDDIR names, under Wine: folders that lack the HTTP library, hold one
// without a function the library needs, or one whose own libcurl is missing, fail the open as on
// other systems, load nothing, and are tried again; the real folder then works for good. And the
// routing-service and PXI chassis query stand-ins, loaded by path, answer a call.
#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#include <windows.h>

#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include "zrqpxi.h"
#include "zrrocoapi.h"

#include <cstdlib>
#include <string>

namespace {

constexpr char kKey[] = "Software\\Korvane\\Common\\Installer";

std::string sharedDirectoryValue() {
    char value[MAX_PATH];
    DWORD size = sizeof value;
    if (RegGetValueA(HKEY_LOCAL_MACHINE, kKey, "ZRSHAREDDIR", RRF_RT_REG_SZ, nullptr, value, &size) != ERROR_SUCCESS) return "";
    return value;
}

void setSharedDirectory(const std::string& folder) {
    ASSERT_EQ(RegSetKeyValueA(HKEY_LOCAL_MACHINE, kKey, "ZRSHAREDDIR", REG_SZ, folder.c_str(),
                              static_cast<DWORD>(folder.size() + 1)),
              ERROR_SUCCESS);
}

// The HTTP library's folder with the SSL initialisation library but no copy of libcurl beside
// either: the SSL library, which links it, cannot load.
std::string withoutLibcurl(const std::string& shared) {
    char temporary[MAX_PATH];
    GetTempPathA(MAX_PATH, temporary);
    const std::string folder = std::string(temporary) + "tiktal-no-libcurl";
    for (const char* sub : {"", "\\zrssl", "\\zrcurl"}) CreateDirectoryA((folder + sub).c_str(), nullptr);
    for (const char* file : {"\\zrssl\\zrsslinit.dll", "\\zrcurl\\curlimpl.dll"})
        EXPECT_TRUE(CopyFileA((shared + file).c_str(), (folder + file).c_str(), FALSE)) << file;
    return folder;
}

bool anyRuntimeLibraryLoaded() {
    return GetModuleHandleA("zrsslinit.dll") || GetModuleHandleA("curlimpl.dll") || GetModuleHandleA("libcurl-4.dll");
}

template <class Fn>
Fn entry(HMODULE module, const char* name) {
    return reinterpret_cast<Fn>(reinterpret_cast<void*>(GetProcAddress(module, name)));
}

TEST(Loading, TheRoutingAndPxiStandInsLoadAndOpenASession) {
    const HMODULE roco = LoadLibraryA(TIKTAL_ROCO_DLL), qpxi = LoadLibraryA(TIKTAL_QPXI_DLL);
    ASSERT_TRUE(roco && qpxi) << "LoadLibraryA: error " << GetLastError();
    const auto createSession = entry<zrrocoapi_createImmediateSession_fn>(roco, "zrrocoapi_createImmediateSession");
    const auto openSession = entry<zrqpxi_openPXISession_fn>(qpxi, "zrqpxi_openPXISession");
    ASSERT_TRUE(createSession && openSession);
    zrrocoapi_Status rocoStatus{};
    EXPECT_NE(createSession(&rocoStatus), 0u);
    EXPECT_EQ(rocoStatus.code, 0);
    zrqpxi_Status qpxiStatus{};
    EXPECT_NE(openSession(1, &qpxiStatus), 0u);
    EXPECT_EQ(qpxiStatus.code, 0);
    FreeLibrary(qpxi);
    FreeLibrary(roco);
}

TEST(Loading, EveryBrokenFolderFailsAndLoadsNothingThenTheRealOneLoadsForGood) {
    const char* host = std::getenv("TIKTAL_TEST_TIMESERVICE");
    ASSERT_NE(host, nullptr) << "run this program through windows-tests.sh";
    const std::string resource = std::string("sync://") + host + "/sync_1";
    const std::string shared = sharedDirectoryValue();
    ASSERT_FALSE(shared.empty()) << "ZRSHAREDDIR is not set";
    const std::string broken = TIKTAL_SHARED_DIR_BROKEN;

    for (const std::string& folder : {std::string("C:\\nonexistent\\shared"), broken + "\\no-curl", broken + "\\no-ssl",
                                      broken + "\\missing-name", broken + "\\no-uninit", broken + "\\init-null",
                                      withoutLibcurl(shared)}) {
        setSharedDirectory(folder);
        ViSession vi = 99;
        EXPECT_EQ(tiktal_init(resource.c_str(), VI_FALSE, VI_FALSE, &vi), tiktalerr_remoteDeviceCommunicationFailure) << folder;
        EXPECT_EQ(vi, 0u) << folder;
        EXPECT_FALSE(anyRuntimeLibraryLoaded()) << folder;
    }

    setSharedDirectory(shared);
    ViSession vi = 0;
    EXPECT_EQ(tiktal_init(resource.c_str(), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    EXPECT_TRUE(GetModuleHandleA("curlimpl.dll"));
    EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
    // Once loaded, the libraries stay: the folder is not looked at again.
    setSharedDirectory("C:\\nonexistent\\shared");
    EXPECT_EQ(tiktal_init(resource.c_str(), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
    setSharedDirectory(shared);
}

}  // namespace
