#include <gtest/gtest.h>

#include <cstdlib>
#include <fcntl.h>
#include <unistd.h>

#include "Platform/CaptureLogSink.h"
#include "Platform/StderrLogSink.h"

namespace ZeltoTouch::Platform {
namespace {

TEST(LogThreshold, ParsesTheFourNamesAndNothingElse) {
    EXPECT_EQ(parseLogThreshold("debug"), LogThreshold::Debug);
    EXPECT_EQ(parseLogThreshold("default"), LogThreshold::Default);
    EXPECT_EQ(parseLogThreshold("error"), LogThreshold::Error);
    EXPECT_EQ(parseLogThreshold("off"), LogThreshold::Off);
    for (const char* bad : {"", "Debug", "info", "debug ", "2"}) EXPECT_FALSE(parseLogThreshold(bad)) << bad;
}

TEST(LogThreshold, AdmitsItsLevelAndAbove) {
    const struct {
        LogThreshold threshold;
        bool debug, normal, error;
    } table[] = {{LogThreshold::Debug, true, true, true},
                 {LogThreshold::Default, false, true, true},
                 {LogThreshold::Error, false, false, true},
                 {LogThreshold::Off, false, false, false}};
    for (const auto& row : table) {
        EXPECT_EQ(thresholdAdmits(row.threshold, LogLevel::Debug), row.debug);
        EXPECT_EQ(thresholdAdmits(row.threshold, LogLevel::Default), row.normal);
        EXPECT_EQ(thresholdAdmits(row.threshold, LogLevel::Error), row.error);
    }
}

TEST(StderrLogSink, ThresholdComesFromTheEnvironment) {
    const struct {
        const char* value;
        LogThreshold expected;
    } table[] = {{nullptr, LogThreshold::Default}, {"debug", LogThreshold::Debug}, {"error", LogThreshold::Error},
                 {"off", LogThreshold::Off},       {"loud", LogThreshold::Default}};
    for (const auto& row : table) {
        if (row.value) {
            setenv(kLogThresholdVariable, row.value, 1);
        } else {
            unsetenv(kLogThresholdVariable);
        }
        EXPECT_EQ(StderrLogSink::thresholdFromEnvironment(), row.expected) << (row.value ? row.value : "(unset)");
    }
    unsetenv(kLogThresholdVariable);
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
    for (ssize_t count; (count = read(pipeEnds[0], chunk, sizeof chunk)) > 0;) text.append(chunk, static_cast<size_t>(count));
    close(pipeEnds[0]);

    const std::string first = "dev.zelto.hid.ZeltoTouch[HIDService] default: Received image frame: 7\n";
    const std::string second = "dev.zelto.hid.ZeltoTouch[Algs] error: Disjoint image\n";
    ASSERT_EQ(std::count(text.begin(), text.end(), '\n'), 2) << text;
    const size_t firstEnd = text.find('\n') + 1;
    // "<date> <time> " precedes each line.
    EXPECT_TRUE(text.substr(0, firstEnd).ends_with(" " + first)) << text;
    EXPECT_TRUE(text.ends_with(" " + second)) << text;
    EXPECT_EQ(text.find("hidden"), std::string::npos);
}

TEST(CaptureLogSink, KeepsAdmittedLinesForCounting) {
    CaptureLogSink sink(LogThreshold::Default);
    Log::setSink(&sink);
    const Log log("HIDService");
    log.debug("not kept");
    log.log("Received image frame: %ju", uint64_t{5});
    log.error("pthread_setschedparam failed: %d", 1);
    Log::setSink(nullptr);

    EXPECT_EQ(sink.count(), 2u);
    EXPECT_EQ(sink.countEqual("Received image frame: 5"), 1u);
    EXPECT_EQ(sink.countContaining("pthread_setschedparam"), 1u);
    EXPECT_EQ(sink.countAtLevel(LogLevel::Error), 1u);
    EXPECT_EQ(sink.lines()[0].category, "HIDService");
    sink.clear();
    EXPECT_EQ(sink.count(), 0u);
}

}  // namespace
}  // namespace ZeltoTouch::Platform
