#include <gtest/gtest.h>

#include <numeric>
#include <utility>
#include <vector>

#include "Shared/Recording/ReportBytes.h"

namespace ZeltoTouch {
namespace {

std::vector<uint8_t> counting(size_t length) {
    std::vector<uint8_t> bytes(length);
    std::iota(bytes.begin(), bytes.end(), uint8_t{7});
    return bytes;
}

bool holds(const ReportBytes& report, const std::vector<uint8_t>& bytes) {
    return report.size() == bytes.size() && std::equal(report.begin(), report.end(), bytes.begin());
}

// Lengths on both sides of the inline capacity, through every way of copying and moving,
// including an inline report replaced by a heap one and back.
TEST(ReportBytesTest, KeepsTheBytesInlineAndOnTheHeap) {
    for (const size_t length : {size_t{0}, size_t{1}, size_t{73}, ReportBytes::kInlineCapacity,
                                ReportBytes::kInlineCapacity + 1, size_t{300}}) {
        const std::vector<uint8_t> bytes = counting(length);
        const ReportBytes original(bytes);
        EXPECT_TRUE(holds(original, bytes)) << length;

        ReportBytes copy(original);
        EXPECT_TRUE(holds(copy, bytes)) << length;
        ReportBytes moved(std::move(copy));
        EXPECT_TRUE(holds(moved, bytes)) << length;
        EXPECT_TRUE(copy.empty()) << length;

        ReportBytes assigned(counting(200));
        assigned = original;
        EXPECT_TRUE(holds(assigned, bytes)) << length;
        ReportBytes moveAssigned(counting(3));
        moveAssigned = std::move(assigned);
        EXPECT_TRUE(holds(moveAssigned, bytes)) << length;
        EXPECT_EQ(moveAssigned, original);
    }
}

}  // namespace
}  // namespace ZeltoTouch
