#include "Shared/Util/ImageText.h"

#include <string>
#include <string_view>
#include <vector>

#include <gtest/gtest.h>

namespace ZeltoTouch::Util {
namespace {

enum Pixel { A, B, C, D, E, F, G, H, I, J, K, L, M, N, O };

std::vector<std::string> lines(std::string_view text) {
    std::vector<std::string> result;
    size_t start = 0;
    for (size_t end; (end = text.find('\n', start)) != std::string_view::npos; start = end + 1)
        result.emplace_back(text.substr(start, end - start));
    result.emplace_back(text.substr(start));
    return result;
}

std::string render(const InputReport::Image& image, bool useUnsignedPixels = false) {
    return std::string(stringFromImage(image, useUnsignedPixels).stringView());
}

std::string spaces(size_t count) { return std::string(count, ' '); }

TEST(ImageText, HeaderBlankLineAndThirteenRows) {
    InputReport::Image image;
    image.frameNumber = 42;
    image.timestampMs = 1000;
    const std::vector<std::string> rows = lines(render(image));
    ASSERT_EQ(rows.size(), 16u);  // header, blank line, 13 rows, nothing after the last break
    EXPECT_EQ(rows[0], "# Image frame 42    time 1000 ms");
    EXPECT_EQ(rows[1], "");
    EXPECT_EQ(rows[2], spaces(12) + "0" + spaces(8) + "0" + spaces(12));
    EXPECT_EQ(rows[15], "");
    for (size_t row = 2; row < 15; ++row) {
        const bool twoCells = row != 3 && row != 8 && row != 13;  // I, K and M stand alone
        EXPECT_EQ(rows[row].size(), twoCells ? 34u : 35u) << row;
    }
}

TEST(ImageText, HeaderNumbersAreUnsigned) {
    InputReport::Image image;
    image.frameNumber = 4294967295u;
    image.timestampMs = 4000000000u;
    EXPECT_EQ(lines(render(image))[0], "# Image frame 4294967295    time 4000000000 ms");
}

struct CellCase {
    int16_t value;
    std::string cell;  // what stands between the 11 leading spaces and the 5 spaces before G
};

class ImageTextCell : public testing::TestWithParam<CellCase> {};

TEST_P(ImageTextCell, FillsTheCellOfPixelH) {
    InputReport::Image image;
    image.signedPixels[H] = GetParam().value;
    image.signedPixels[G] = 123;
    EXPECT_EQ(lines(render(image))[2], spaces(11) + GetParam().cell + spaces(5) + "123 " + spaces(10));
}

INSTANTIATE_TEST_SUITE_P(Values, ImageTextCell,
                         testing::Values(CellCase{5, " 5  "}, CellCase{-5, "-5  "}, CellCase{-123, "-123"},
                                         CellCase{1234, "1234"},
                                         // Wider than the cell: whole, then one space.
                                         CellCase{10000, "10000 "}, CellCase{-1000, "-1000 "},
                                         CellCase{-32768, "-32768 "}));

TEST(ImageText, UnsignedAndSignedDifferOnlyInTheNumbers) {
    InputReport::Image image;
    image.unsignedPixels[K] = 65535;
    image.signedPixels[K] = -1;
    EXPECT_EQ(lines(render(image, true))[8], spaces(16) + "65535 " + spaces(15));
    EXPECT_EQ(lines(render(image, false))[8], spaces(16) + "-1  " + spaces(15));
}

TEST(ImageText, PixelsAtTwoPlacesShowTheSameNumber) {
    InputReport::Image image;
    for (int pixel = A; pixel <= O; ++pixel) image.signedPixels[pixel] = static_cast<int16_t>(10 + pixel);
    const std::vector<std::string> rows = lines(render(image));
    const auto row = [](size_t lead, const char* first, size_t gap, const char* second, size_t trail) {
        return spaces(lead) + first + spaces(gap) + second + spaces(trail);
    };
    const auto single = [](const char* number) { return spaces(16) + number + spaces(17); };
    const std::vector<std::string> expected = {
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
    for (size_t index = 0; index < expected.size(); ++index) EXPECT_EQ(rows[index + 2], expected[index]) << index;
}

}  // namespace
}  // namespace ZeltoTouch::Util
