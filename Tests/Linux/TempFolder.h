#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>

namespace ZeltoTouch::Testing {

// A fresh folder under the system's temporary folder, removed with everything in it.
class TempFolder {
public:
    TempFolder() {
        std::string pattern = (std::filesystem::temp_directory_path() / "zelto-linux-XXXXXX").string();
        if (::mkdtemp(pattern.data()) == nullptr) throw std::runtime_error("mkdtemp failed");
        _path = pattern;
    }
    ~TempFolder() {
        std::error_code ignored;
        std::filesystem::remove_all(_path, ignored);
    }
    TempFolder(const TempFolder&) = delete;
    TempFolder& operator=(const TempFolder&) = delete;

    const std::filesystem::path& path() const noexcept { return _path; }

    // A hidraw node as sysfs lists it, with its HID parent's uevent.
    void addSysfsHidrawNode(const std::string& name, const std::string& uevent) const {
        const auto device = _path / "class" / "hidraw" / name / "device";
        std::filesystem::create_directories(device);
        std::ofstream(device / "uevent") << uevent;
    }

private:
    std::filesystem::path _path;
};

}  // namespace ZeltoTouch::Testing
