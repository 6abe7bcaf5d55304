#include "Shared/Util/ImageText.h"

#include <cassert>
#include <cstdint>
#include <cstdio>
#include <string>
#include <string_view>

namespace ZeltoTouch::Util {

namespace {
// Where each pixel sits: a run of four equal letters (A = pixel 0 ... O = pixel 14) marks a cell.
constexpr std::string_view kTemplateRows[] = {
    "           HHHH      GGGG           ",
    "                IIII                ",
    "     BBBB                  AAAA     ",
    "         JJJJ          JJJJ         ",
    "     FFFF                  EEEE     ",
    " AAAA                          BBBB ",
    "                KKKK                ",
    " DDDD                          CCCC ",
    "     EEEE                  FFFF     ",
    "         LLLL          LLLL         ",
    "     CCCC                  DDDD     ",
    "                MMMM                ",
    "           NNNN      OOOO           ",
};
}  // namespace

PropertyValue stringFromImage(const InputReport::Image& image, bool useUnsignedPixels) {
    std::string body;
    for (std::string_view row : kTemplateRows) {
        size_t runLength = 0;
        char c = 0;
        for (char templateChar : row) {
            if (templateChar != ' ') {
                c = templateChar;
                ++runLength;
                continue;
            }
            if (runLength == 0) { body += ' '; continue; }
            assert(c>='A' && c<='O');
            // The run and the space that ends it become one cell as long as the run.
            const size_t index = static_cast<size_t>(c - 'A');
            const intmax_t value = useUnsignedPixels ? intmax_t{image.unsignedPixels[index]}
                                                     : intmax_t{image.signedPixels[index]};
            char number[32];
            const int written = std::snprintf(number, sizeof number, "%*jd", static_cast<int>(runLength / 2), value);
            const size_t numberLength = static_cast<size_t>(written);
            body.append(number, numberLength);
            // A number wider than its cell cannot keep the columns: it is printed whole and
            // followed by one space, so it never runs into its neighbour.
            body.append(numberLength <= runLength ? runLength - numberLength : 1, ' ');
            runLength = 0;
        }
        body += '\n';
    }
    std::string text = "# Image frame " + std::to_string(image.frameNumber) + "    time " +
                       std::to_string(image.timestampMs) + " ms\n\n";
    text += body;
    return PropertyValue::string(text);
}

}  // namespace ZeltoTouch::Util
