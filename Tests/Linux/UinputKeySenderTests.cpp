#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <linux/input.h>
#include <stdexcept>
#include <unistd.h>
#include <vector>

#include "Tools/UinputKeySender.h"

namespace ZeltoTouch::Tools {
namespace {

const std::vector<unsigned> kKeys{KEY_PLAYPAUSE, KEY_VOLUMEUP};

std::string failureOf(const std::string& path) {
    try {
        UinputKeySender sender(kKeys, path);
    } catch (const std::runtime_error& error) {
        return error.what();
    }
    return "made a keyboard";
}

TEST(UinputKeySender, AMissingUinputDeviceSaysToLoadTheModule) {
    EXPECT_EQ(failureOf("/dev/uinput-missing-for-test"),
              "/dev/uinput-missing-for-test does not exist: media keys need the uinput kernel module (modprobe uinput)");
}

TEST(UinputKeySender, SomethingThatIsNotUinputRefusesTheKeyboard) {
    char path[] = "/tmp/zelto-not-uinput-XXXXXX";
    const int fd = ::mkstemp(path);
    ASSERT_GE(fd, 0);
    ::close(fd);
    EXPECT_EQ(failureOf(path),
              std::string("Cannot create a virtual keyboard through ") + path + ": Inappropriate ioctl for device");
    ::unlink(path);
}

TEST(UinputKeySender, AnUnwritableUinputDeviceSaysHowToGetAccess) {
    if (::geteuid() == 0) GTEST_SKIP() << "root may write anything";
    char path[] = "/tmp/zelto-readonly-uinput-XXXXXX";
    const int fd = ::mkstemp(path);
    ASSERT_GE(fd, 0);
    ::fchmod(fd, 0444);
    ::close(fd);
    EXPECT_EQ(failureOf(path), std::string(path) +
                                   " is not writable: the udev rule 70-zelto-touch.rules gives the zelto-touch group "
                                   "write access; add your user to that group or run as root");
    ::unlink(path);
}

TEST(KeyNames, NamesAndNumbersBothNameKeys) {
    EXPECT_EQ(keyCodeFromName("KEY_VOICECOMMAND"), KEY_VOICECOMMAND);
    EXPECT_EQ(keyCodeFromName("KEY_MUTE"), KEY_MUTE);
    EXPECT_EQ(keyCodeFromName("164"), KEY_PLAYPAUSE);
    for (const char* bad : {"", "KEY_NOPE", "key_mute", "0", "99999", "REL_X", "12abc"}) {
        EXPECT_FALSE(keyCodeFromName(bad)) << bad;
    }
    EXPECT_EQ(keyName(KEY_VOLUMEUP), "KEY_VOLUMEUP");
}

}  // namespace
}  // namespace ZeltoTouch::Tools
