#include <gtest/gtest.h>

#include <string>

#include "msg_capture.h"
#include "pm_device.h"
#include "scoped_env.h"
#include "scratch_dir.h"

namespace {

class DeviceTest : public testing::Test {
  protected:
    ScopedEnv device_path_{"HX_DEVICE_PATH", nullptr};
    const PM_SPEC devices_{nullptr, PM_BIND_DEVICE};
};

TEST_F(DeviceTest, SampleDevicesOfTheDeviceFolderAreKnownInAnyCase) {
    EXPECT_TRUE(devices_.isvalidpmname("qx10", 1));
    EXPECT_TRUE(devices_.isvalidpmname("QX20", 1));
    EXPECT_TRUE(devices_.isvalidpmname("Qz400", 1));
    EXPECT_FALSE(devices_.isvalidpmname("qx11", 1));
    EXPECT_NE(PM_SPEC::find_device_file("qx10").find("share/vrx/devices/qx10.acd"),
              std::string::npos);
}

TEST_F(DeviceTest, NamesThatAreNotPlainFileNamesAreNeverLookedUp) {
    ScratchDir dir;
    ScratchDir::write_file(dir.file("evil.acd"), "");
    device_path_.set(dir.path().c_str());
    EXPECT_TRUE(devices_.isvalidpmname("evil", 1));
    for (const char* name : {"", "../devices/qx10", "sub/qx10", ".qx10", "..", "."}) {
        EXPECT_FALSE(devices_.isvalidpmname(name, 1)) << name;
    }
    EXPECT_FALSE(devices_.isvalidpmname(nullptr, 1));
}

TEST_F(DeviceTest, DevicePathIsSearchedInOrderAndEmptyEntriesNameNoDirectory) {
    ScratchDir first, second;
    ScratchDir::write_file(first.file("qx10.acd"), "first");
    ScratchDir::write_file(second.file("only2.acd"), "second");
    const std::string path = "::" + first.path() + ":/nonexistent:" + second.path() + "/";
    device_path_.set(path.c_str());
    EXPECT_EQ(PM_SPEC::find_device_file("qx10"), first.file("qx10.acd"));
    EXPECT_EQ(PM_SPEC::find_device_file("only2"), second.file("only2.acd"));
    EXPECT_TRUE(devices_.isvalidpmname("qz400", 1));  // still found in the device folder
}

TEST_F(DeviceTest, UnknownDeviceIsReportedOnlyWhenAsked) {
    MsgCapture capture;
    EXPECT_FALSE(devices_.isvalidpmname("nosuch", 1));
    EXPECT_TRUE(capture.messages().empty());
    EXPECT_FALSE(devices_.isvalidpmname("nosuch", 0));
    EXPECT_EQ(capture.texts(PORT_MSG_WARNING),
              std::vector<std::string>{"no device description found for 'nosuch'\n"});
}

}  // namespace
