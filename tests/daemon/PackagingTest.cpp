// The shipped udev rule and systemd unit agree with the daemon: the rule matches the default
// surface IDs, and the unit keeps the sandbox the daemon is written for.

#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <sstream>

#include "daemon/SurfaceIds.h"

namespace TolkaTouch {
namespace {

std::string readFile(const std::string& path) {
    std::ifstream file(path);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

TEST(PackagingTest, UdevRuleMatchesTheDefaultSurfaceIds) {
    char match[64];
    std::snprintf(match, sizeof(match), "KERNELS==\"*:%04X:%04X.*\"", SurfaceIds::kDefaultVendorId,
                  SurfaceIds::kDefaultProductId);
    std::string rules = readFile(TOLKA_PACKAGING_DIR "/70-tolkatouch.rules");
    EXPECT_NE(rules.find(std::string("SUBSYSTEM==\"hidraw\", ") + match + ", OWNER=\"tolkatouch\""), std::string::npos)
        << rules;
    EXPECT_NE(rules.find("KERNEL==\"uinput\", OWNER=\"tolkatouch\""), std::string::npos);
}

TEST(PackagingTest, TheUserAtTheSeatMayReadTheSurface) {
    std::string rules = readFile(TOLKA_PACKAGING_DIR "/70-tolkatouch.rules");
    EXPECT_NE(rules.find("MODE=\"0600\", TAG+=\"uaccess\"\n"), std::string::npos) << rules;
}

TEST(PackagingTest, UnitRunsSandboxedWithOnlyTheDevicesItNeeds) {
    std::string unit = readFile(TOLKA_PACKAGING_DIR "/tolkatouchd.service.in");
    for (const char* line : {"User=tolkatouch", "NoNewPrivileges=yes", "ProtectSystem=strict", "DevicePolicy=closed",
                             "DeviceAllow=char-hidraw rw", "DeviceAllow=/dev/uinput rw",
                             "RuntimeDirectory=tolkatouch", "Type=notify", "ExecStart=@TOLKA_DAEMON_PATH@",
                             "IPAddressDeny=any", "ProcSubset=pid", "RemoveIPC=yes"}) {
        EXPECT_NE(unit.find(std::string("\n") + line + "\n"), std::string::npos) << line;
    }
}

}  // namespace
}  // namespace TolkaTouch
