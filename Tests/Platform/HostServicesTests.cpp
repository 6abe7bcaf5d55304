// The platform's log sinks and plug-in host.
#include <gtest/gtest.h>

#include <cctype>
#include <cstdlib>
#include <sstream>
#include <stdexcept>
#include <unistd.h>

#include "Platform/PluginHost.h"
#include "Platform/StderrLogSink.h"

namespace ZeltoTouch::Platform {
namespace {

TEST(LogThreshold, ParsesTheFourNamesEachAdmittingItsLevelAndAboveAlsoFromTheEnvironment) {
    const struct {
        const char* name;
        LogThreshold threshold;
        bool debug, normal, error;
    } table[] = {{"debug", LogThreshold::Debug, true, true, true},
                 {"default", LogThreshold::Default, false, true, true},
                 {"error", LogThreshold::Error, false, false, true},
                 {"off", LogThreshold::Off, false, false, false}};
    for (const auto& row : table) {
        EXPECT_EQ(parseLogThreshold(row.name), row.threshold);
        EXPECT_EQ(thresholdAdmits(row.threshold, LogLevel::Debug), row.debug) << row.name;
        EXPECT_EQ(thresholdAdmits(row.threshold, LogLevel::Default), row.normal) << row.name;
        EXPECT_EQ(thresholdAdmits(row.threshold, LogLevel::Error), row.error) << row.name;
    }
    for (const char* bad : {"", "Debug", "info", "debug ", "2"}) EXPECT_FALSE(parseLogThreshold(bad)) << bad;

    // The stderr sink takes its threshold from the environment, the default when unset or unknown.
    const std::pair<const char*, LogThreshold> environment[] = {{nullptr, LogThreshold::Default},
                                                                {"debug", LogThreshold::Debug},
                                                                {"off", LogThreshold::Off},
                                                                {"loud", LogThreshold::Default}};
    unsetenv(kLogThresholdVariable);
    for (const auto& [value, expected] : environment) {
        if (value) setenv(kLogThresholdVariable, value, 1);
        EXPECT_EQ(StderrLogSink::thresholdFromEnvironment(), expected) << (value ? value : "(unset)");
        unsetenv(kLogThresholdVariable);
    }
}

TEST(StderrLogSink, WritesFilteredLinesWithSubsystemCategoryAndLevel) {
    int pipeEnds[2];
    ASSERT_EQ(pipe(pipeEnds), 0);
    {
        StderrLogSink sink(LogThreshold::Default, pipeEnds[1]);
        sink.write("HIDService", LogLevel::Debug, "hidden");
        sink.write("HIDService", LogLevel::Default, "Received image frame: 7");
        sink.setThreshold(LogThreshold::Error);
        sink.write("Algs", LogLevel::Default, "hidden too");
        sink.write("Algs", LogLevel::Error, "Disjoint image");
    }
    close(pipeEnds[1]);
    std::string text;
    char chunk[256];
    for (ssize_t count; (count = read(pipeEnds[0], chunk, sizeof chunk)) > 0;) {
        text.append(chunk, static_cast<size_t>(count));
    }
    close(pipeEnds[0]);

    // Each line: the local time to the microsecond, then subsystem, category, level and message.
    EXPECT_TRUE(text.ends_with('\n')) << text;
    std::vector<std::string> written;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        std::string stamp = line.substr(0, 27);
        for (char& c : stamp) c = std::isdigit(static_cast<unsigned char>(c)) ? '0' : c;
        EXPECT_EQ(stamp, "0000-00-00 00:00:00.000000 ") << line;
        written.push_back(line.substr(std::min<size_t>(27, line.size())));
    }
    EXPECT_EQ(written, (std::vector<std::string>{"dev.zelto.hid.ZeltoTouch[HIDService] default: Received image frame: 7",
                                                 "dev.zelto.hid.ZeltoTouch[Algs] error: Disjoint image"}));
}

std::string loadFailure(const std::string& path) {
    try {
        PluginHost::load(path);
    } catch (const std::runtime_error& error) {
        return error.what();
    }
    return "loaded " + path;
}

TEST(PluginHost, LoadFailuresNameThePathAndTheCause) {
    const std::string missing = loadFailure("/nonexistent/ZeltoTouch.so");
    EXPECT_TRUE(missing.starts_with("Cannot load HID service plug-in \"/nonexistent/ZeltoTouch.so\": ")) << missing;
    EXPECT_NE(missing.find("No such file or directory"), std::string::npos) << missing;
    // The C library is a loadable module that certainly exports no plug-in factory.
    EXPECT_EQ(loadFailure("libc.so.6"),
              "Cannot load HID service plug-in \"libc.so.6\": no factory named ZeltoTouchHIDServiceFactory");
}

}  // namespace
}  // namespace ZeltoTouch::Platform
