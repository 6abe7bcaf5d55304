// zelto-touch render: the text picture of each image report in a recording.
#include <cstdio>
#include <optional>
#include <stdexcept>
#include <string>

#include "Shared/Util/ImageText.h"
#include "Tools/CommandSupport.h"
#include "Tools/Commands.h"
#include "Tools/RecordingFile.h"

namespace ZeltoTouch::Tools {
namespace {

struct RenderSettings {
    std::string path;
    bool useUnsignedPixels = false;
    std::optional<uint32_t> frameNumber;
};

// Pictures in the file's order, one empty line between two. Frame numbers restart after a
// firmware reset, so --frame may match more than one image.
void render(const RenderSettings& settings) {
    const RecordingFile file = loadRecordingFile(settings.path);
    size_t rendered = 0;
    for (const PipelineRecording::Frame& frame : file.recording.frames()) {
        if (frame.type != PipelineRecording::Frame::Type::InputReport) continue;
        const auto image = InputReport::Image::parse(frame.data.data(), frame.data.size());
        if (!image || (settings.frameNumber && image->frameNumber != *settings.frameNumber)) continue;
        if (rendered++ > 0) std::fputc('\n', stdout);
        const PropertyValue picture = Util::stringFromImage(*image, settings.useUnsignedPixels);
        std::fwrite(picture.stringView().data(), 1, picture.stringView().size(), stdout);
    }
    if (rendered == 0 && settings.frameNumber) {
        throw std::runtime_error(settings.path + " has no image with frame number " +
                                 std::to_string(*settings.frameNumber));
    }
}

}  // namespace

void addRenderCommand(CLI::App& app) {
    auto settings = std::make_shared<RenderSettings>();
    CLI::App* command = app.add_subcommand(
        "render", "Draw each image report of a recording as a text picture of the sensor's fifteen channels");
    command->add_option("FILE", settings->path, "Recording container (JSON, version 0, 1 or 2)")->required();
    command->add_flag("--unsigned", settings->useUnsignedPixels,
                      "Show the raw unsigned channel counts instead of the signed values the algorithm reads");
    command->add_option("--frame", settings->frameNumber, "Draw only the image(s) with this frame number");
    command->callback([settings] { runCommand([&] { render(*settings); }); });
}

}  // namespace ZeltoTouch::Tools
