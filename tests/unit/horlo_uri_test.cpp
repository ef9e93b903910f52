// Time-service resource names.
#include <gtest/gtest.h>

#include "client/horlo_uri.h"
#include "errors/zrerr.h"

namespace {

using horloUtils::HorloUri;
using horloUtils::isHorloUri;

TEST(HorloUri, SplitsHostAndDeviceAndKeepsTheirCase) {
    const HorloUri uri("SYNC://Target-7:8080/Sync_1");
    EXPECT_EQ(uri.getHost(), "Target-7:8080");
    EXPECT_EQ(uri.getDeviceName(), "Sync_1");
    EXPECT_EQ(HorloUri("Sync://h/d:1").getDeviceName(), "d:1");
    EXPECT_TRUE(isHorloUri("sync://127.0.0.2:1234/system"));
    EXPECT_TRUE(isHorloUri("sync://[::1]:80/d"));
    EXPECT_TRUE(isHorloUri("sync://h\xC3\xA9te/d"));  // a host name in UTF-8
}

TEST(HorloUri, RejectsEveryOtherShape) {
    for (const char* name : {"", "://h/d", "sync:/h/d", "sync://h", "sync:///d", "sync://h/", "sync://h/d/e",
                             "http://h/d", "syncx://h/d", "PXI0::3-4.0::INSTR", "SyncTestInternal___",
                             // Hosts with credentials, a query, a fragment, a back slash, white space,
                             // control characters or malformed UTF-8 would send the request elsewhere.
                             "sync://user:pass@h/d", "sync://@h/d", "sync://h?x/d", "sync://h#x/d", "sync://h\\x/d",
                             "sync://h x/d", "sync://h\t/d", "sync://h\r\n/d", "sync://h\x7F/d", "sync://h\xC0\xAE/d",
                             "sync://h\xFF/d"}) {
        EXPECT_FALSE(isHorloUri(name)) << name;
        try {
            HorloUri uri(name);
            ADD_FAILURE() << name << " was accepted";
        } catch (const zrerr::Exception& e) {
            EXPECT_EQ(e.code(), tiktalerr_invalidResourceNameFormat);
            EXPECT_NE(std::string(e.what()).find("\"func\":\"horloUtils::HorloUri::HorloUri\""), std::string::npos);
        }
    }
}

}  // namespace
