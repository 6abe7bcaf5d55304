#include <gtest/gtest.h>

#include <stdexcept>

#include "Host/HIDServicePlugIn.h"
#include "Platform/PluginHost.h"

namespace ZeltoTouch::Platform {
namespace {

TEST(PluginHost, AMissingModuleGivesAnErrorNamingThePathAndTheCause) {
    try {
        PluginHost::load("/nonexistent/ZeltoTouch.so");
        FAIL() << "loaded a missing module";
    } catch (const std::runtime_error& error) {
        const std::string message = error.what();
        EXPECT_TRUE(message.starts_with("Cannot load HID service plug-in \"/nonexistent/ZeltoTouch.so\": ")) << message;
        EXPECT_NE(message.find("No such file or directory"), std::string::npos) << message;
    }
}

TEST(PluginHost, AModuleWithoutTheFactoryIsRefused) {
    // The C library is a loadable module that certainly exports no plug-in factory.
    try {
        PluginHost::load("libc.so.6");
        FAIL() << "accepted a module without a factory";
    } catch (const std::runtime_error& error) {
        EXPECT_STREQ(error.what(), "Cannot load HID service plug-in \"libc.so.6\": no factory named ZeltoTouchHIDServiceFactory");
    }
}

TEST(HIDServicePlugIn, TheThreeIdentifiersDiffer) {
    EXPECT_FALSE(kZeltoHIDServicePlugInTypeID == kZeltoPlugInInterfaceID);
    EXPECT_FALSE(kZeltoHIDServicePlugInTypeID == kZeltoHIDServiceInterfaceID);
    EXPECT_FALSE(kZeltoPlugInInterfaceID == kZeltoHIDServiceInterfaceID);
    EXPECT_TRUE(kZeltoPlugInInterfaceID == ZeltoUUID(kZeltoPlugInInterfaceID));
}

TEST(HIDServicePlugIn, StatusCodesHaveTheHostsValues) {
    EXPECT_EQ(static_cast<uint32_t>(kZeltoNoResources), 0xE00002BEu);
    EXPECT_EQ(static_cast<uint32_t>(kZeltoUnsupported), 0xE00002C7u);
    EXPECT_EQ(static_cast<uint32_t>(kZeltoNoInterface), 0x80000004u);
}

}  // namespace
}  // namespace ZeltoTouch::Platform
