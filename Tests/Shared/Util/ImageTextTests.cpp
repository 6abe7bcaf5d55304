#include "Shared/Util/ImageText.h"

#include <sstream>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace ZeltoTouch::Util {
namespace {

enum Pixel { A, B, C, D, E, F, G, H, I, J, K, L, M, N, O };

std::vector<std::string> lines(const InputReport::Image& image, bool useUnsignedPixels = false) {
    std::istringstream text{std::string(stringFromImage(image, useUnsignedPixels).stringView())};
    std::vector<std::string> result;
    for (std::string line; std::getline(text, line);) result.push_back(line);
    return result;
}

std::string spaces(size_t count) { return std::string(count, ' '); }

TEST(ImageText, NumbersFillTheirCellAndWiderOnesStayWhole) {
    const std::pair<int16_t, std::string> cases[] = {  // the text between 11 leading spaces and 5 before G
        {5, " 5  "}, {-5, "-5  "}, {-123, "-123"}, {1234, "1234"},
        {10000, "10000 "}, {-1000, "-1000 "}, {-32768, "-32768 "},  // wider than the cell: whole, then one space
    };
    for (const auto& [value, cell] : cases) {
        InputReport::Image image;
        image.signedPixels[H] = value;
        image.signedPixels[G] = 123;
        EXPECT_EQ(lines(image)[2], spaces(11) + cell + spaces(5) + "123 " + spaces(10)) << value;
    }
    InputReport::Image image;
    image.unsignedPixels[K] = 65535;
    image.signedPixels[K] = -1;
    EXPECT_EQ(lines(image, true)[8], spaces(16) + "65535 " + spaces(15));
    EXPECT_EQ(lines(image, false)[8], spaces(16) + "-1  " + spaces(15));
}

TEST(ImageText, HeaderBlankLineAndThirteenRowsWherePixelsAtTwoPlacesShowTheSameNumber) {
    InputReport::Image image;
    image.frameNumber = 4294967295u;  // unsigned
    image.timestampMs = 4000000000u;
    for (int pixel = A; pixel <= O; ++pixel) image.signedPixels[pixel] = static_cast<int16_t>(10 + pixel);
    const auto row = [](size_t lead, const char* first, size_t gap, const char* second, size_t trail) {
        return spaces(lead) + first + spaces(gap) + second + spaces(trail);
    };
    const auto single = [](const char* number) { return spaces(16) + number + spaces(17); };
    const std::vector<std::string> expected = {
        "# Image frame 4294967295    time 4000000000 ms", "",
        row(11, "17", 7, "16", 12),  // H G
        single("18"),                // I
        row(5, "11", 19, "10", 6),   // B A
        row(9, "19", 11, "19", 10),  // J J
        row(5, "15", 19, "14", 6),   // F E
        row(1, "10", 27, "11", 2),   // A B
        single("20"),                // K
        row(1, "13", 27, "12", 2),   // D C
        row(5, "14", 19, "15", 6),   // E F
        row(9, "21", 11, "21", 10),  // L L
        row(5, "12", 19, "13", 6),   // C D
        single("22"),                // M
        row(11, "23", 7, "24", 12),  // N O
    };
    EXPECT_EQ(lines(image), expected);
    EXPECT_EQ(stringFromImage(image, false).stringView().back(), '\n');
}

}  // namespace
}  // namespace ZeltoTouch::Util
