// zelto-touch run: the live daemon. The plug-in runs on a real sensor behind hidraw; its events
// are printed and, with --keys, sent on as media keys.

#include <CLI/CLI.hpp>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <fcntl.h>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <linux/input.h>
#include <memory>
#include <mutex>
#include <optional>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include "Host/Format.h"
#include "Platform/DeviceRegistry.h"
#include "Platform/HidrawDevice.h"
#include "Platform/HidrawDiscovery.h"
#include "Platform/LogThreshold.h"
#include "Platform/MediaKeys.h"
#include "Platform/PluginHost.h"
#include "Platform/StderrLogSink.h"
#include "Shared/Util/HostClock.h"
#include "Shared/Util/MachTime.h"
#include "Tools/CommandSupport.h"
#include "Tools/Commands.h"
#include "Tools/EventLines.h"
#include "Tools/PluginLocation.h"
#include "Tools/RecordingFile.h"
#include "Tools/SensorMatchOption.h"
#include "Tools/UinputKeySender.h"

namespace ZeltoTouch::Tools {

namespace {

using namespace Platform;

struct RunOptions {
    std::string devicePath;
    std::string match;
    std::string format = "text";
    std::string recordPath;
    bool keys = false;
    std::string holdKey = "KEY_VOICECOMMAND";
    unsigned repeatIntervalMs = 250;
    std::string logLevel;
    // Stand-ins for tests and unusual systems.
    std::string uinputPath = std::string(UinputKeySender::kDefaultPath);
    std::string sysfsRoot = "/sys";
    int standInFd = -1;
};

// A failure that ends the command before or after the session; the message is for the user.
struct RunError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

std::shared_ptr<HidrawDevice> openSensor(const RunOptions& options) {
    if (options.standInFd >= 0) {
        if (::fcntl(options.standInFd, F_GETFD) < 0) throw RunError(format("Descriptor %d is not open", options.standInFd));
        HidrawIdentity identity;
        identity.name = "stand-in";
        return std::make_shared<HidrawDevice>(options.standInFd, format("descriptor %d", options.standInFd), identity);
    }
    if (!options.devicePath.empty()) return HidrawDevice::openNode(options.devicePath);

    const VendorProduct ids = matchedIDs(options.match);
    const auto matching = nodesMatching(listHidrawNodes(options.sysfsRoot), ids);
    if (matching.empty()) {
        throw RunError(format("No hidraw device matches %s: is the sensor plugged in? (`zelto-touch devices` lists "
                              "the hidraw devices)",
                              formatVendorProduct(ids)));
    }
    if (matching.size() > 1) {
        std::string nodes;
        for (const auto& node : matching) nodes += (nodes.empty() ? "" : ", ") + node.devicePath;
        throw RunError(format("Several hidraw devices match %s (%s): choose one with --device", formatVendorProduct(ids),
                              nodes));
    }
    return HidrawDevice::openNode(matching.front().devicePath);
}

// SIGINT, SIGTERM and SIGUSR1 as a readable descriptor. Blocked before any thread starts, so
// every thread inherits the mask and only the main loop ever sees them.
class SignalDescriptor {
public:
    SignalDescriptor() {
        sigemptyset(&_signals);
        for (int signal : {SIGINT, SIGTERM, SIGUSR1}) sigaddset(&_signals, signal);
        pthread_sigmask(SIG_BLOCK, &_signals, &_previousMask);
        _fd = signalfd(-1, &_signals, SFD_CLOEXEC | SFD_NONBLOCK);
        if (_fd < 0) throw RunError(format("Cannot watch for signals: %s", std::strerror(errno)));
    }
    ~SignalDescriptor() {
        ::close(_fd);
        pthread_sigmask(SIG_SETMASK, &_previousMask, nullptr);
    }
    SignalDescriptor(const SignalDescriptor&) = delete;
    SignalDescriptor& operator=(const SignalDescriptor&) = delete;

    int fd() const noexcept { return _fd; }
    // The next pending signal, or 0.
    int take() {
        signalfd_siginfo info{};
        return ::read(_fd, &info, sizeof info) == sizeof info ? static_cast<int>(info.ssi_signo) : 0;
    }

private:
    sigset_t _signals{};
    sigset_t _previousMask{};
    int _fd = -1;
};

// Wakes the main loop from other threads (a lost sensor, a key repetition that started).
class WakeUp {
public:
    WakeUp() : _fd(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
        if (_fd < 0) throw RunError(format("Cannot create an event descriptor: %s", std::strerror(errno)));
    }
    ~WakeUp() { ::close(_fd); }
    WakeUp(const WakeUp&) = delete;
    WakeUp& operator=(const WakeUp&) = delete;

    int fd() const noexcept { return _fd; }
    void signal() {
        const uint64_t one = 1;
        [[maybe_unused]] const auto written = ::write(_fd, &one, sizeof one);
    }
    void drain() {
        uint64_t count;
        [[maybe_unused]] const auto read = ::read(_fd, &count, sizeof count);
    }

private:
    int _fd;
};

// Gestures to media keys: the key presses of each event at once, repetitions when due. Events
// arrive on the host's queue, repetitions come from the main loop; one lock serialises both.
class MediaKeyOutput {
public:
    using Clock = KeyRepeatSchedule::Clock;

    MediaKeyOutput(const RunOptions& options, unsigned holdKey, WakeUp& wakeUp)
        : _holdKey(holdKey),
          _sender(std::vector<unsigned>{KEY_PLAYPAUSE, KEY_VOLUMEDOWN, KEY_VOLUMEUP, holdKey}, options.uinputPath),
          _schedule(std::chrono::milliseconds(options.repeatIntervalMs)),
          _wakeUp(wakeUp) {}

    void handle(const HIDEvent& event) {
        const KeyCommand command = keyCommandForEvent(event, _holdKey);
        std::lock_guard lock(_lock);
        for (unsigned key : _schedule.apply(command, Clock::now())) send(key);
        if (command.action == KeyAction::PressAndRepeat) _wakeUp.signal();  // the main loop's timeout changed
    }

    void sendDue() {
        std::lock_guard lock(_lock);
        if (const auto key = _schedule.keyDue(Clock::now())) send(*key);
    }

    std::optional<Clock::time_point> nextDue() const {
        std::lock_guard lock(_lock);
        return _schedule.nextDue();
    }

private:
    void send(unsigned key) {
        if (!_sender.tap(key)) _log.error("Could not send %s through uinput", keyName(key));
    }

    const unsigned _holdKey;
    UinputKeySender _sender;
    KeyRepeatSchedule _schedule;
    WakeUp& _wakeUp;
    mutable std::mutex _lock;
    Log _log{"MediaKeys"};
};

void saveRecording(PluginHost& host, const std::string& path) {
    const PropertyValue recording = host.copyProperty(PropertyValue::string("Recording"));
    if (!recording.isString()) throw RunError("The plug-in gave no recording to save");
    writeFileAtomically(path, recording.stringView());
    std::cerr << format("Saved the recording to %s\n", path);
}

// Over the logging runCommand installs: a daemon's stderr is a journal, so unless told
// otherwise only errors go there, not a line per frame.
void installLogging(const std::string& level) {
    if (level.empty() && std::getenv(kLogThresholdVariable) != nullptr) return;
    static StderrLogSink sink(level.empty() ? LogThreshold::Error : *parseLogThreshold(level));
    Log::setSink(&sink);
}

// The plug-in on the sensor, driven in the host's order: probe, start, open, schedule. Whatever
// happens, the host's destructor unschedules, closes and stops what was done, then releases the
// plug-in; the device backend goes last.
class LiveSession {
public:
    LiveSession(const std::shared_ptr<HidrawDevice>& device, PluginHost::EventSink sink)
        : _service([device] { return device; }), _host(PluginHost::load(pluginModulePath().string())) {
        int32_t score = 0;
        ZeltoReturn status = _host->probe(_service.handle(), PropertyValue(), score);
        if (status == kZeltoSuccess) status = _host->start(_service.handle());
        if (status != kZeltoSuccess) {
            throw RunError(format("The plug-in could not start on %s (status 0x%08x)", device->path(),
                                  static_cast<uint32_t>(status)));
        }
        if (!_host->open()) throw RunError(format("The plug-in could not open %s", device->path()));
        _host->schedule(std::move(sink));
    }

    // Ends report processing and waits for the events already on their way.
    void finishEvents() {
        _host->unschedule();
        _host->queue().barrier();
    }

    PluginHost& host() { return *_host; }

private:
    ScopedDeviceService _service;
    std::unique_ptr<PluginHost> _host;
};

enum class SessionEnd { Stopped, SensorLost };

// Waits for SIGINT, SIGTERM or a lost sensor, saving the recording on SIGUSR1 and sending due
// key repetitions meanwhile.
SessionEnd waitForEnd(SignalDescriptor& signals, WakeUp& wakeUp, const HidrawDevice& device, MediaKeyOutput* keys,
                      const std::function<void()>& saveRecordingNow) {
    for (;;) {
        if (device.isDisconnected()) return SessionEnd::SensorLost;
        int timeoutMs = -1;
        if (const auto due = keys ? keys->nextDue() : std::nullopt) {
            const auto wait = std::chrono::ceil<std::chrono::milliseconds>(*due - MediaKeyOutput::Clock::now());
            timeoutMs = static_cast<int>(std::max<int64_t>(wait.count(), 0));
        }
        pollfd watched[] = {{signals.fd(), POLLIN, 0}, {wakeUp.fd(), POLLIN, 0}};
        if (::poll(watched, 2, timeoutMs) < 0 && errno != EINTR) {
            throw RunError(format("Cannot wait for events: %s", std::strerror(errno)));
        }
        if (watched[1].revents & POLLIN) wakeUp.drain();
        if (keys) keys->sendDue();
        while (const int signal = signals.take()) {
            if (signal != SIGUSR1) return SessionEnd::Stopped;
            saveRecordingNow();
        }
    }
}

void runSession(const RunOptions& options) {
    installLogging(options.logLevel);
    const auto holdKey = keyCodeFromName(options.holdKey);
    if (!holdKey) {
        throw RunError(format("Unknown key %s for --hold-key (use a name such as KEY_VOICECOMMAND)", options.holdKey));
    }

    // Everything that can fail for want of the right device or rights fails here, before the
    // plug-in runs.
    std::shared_ptr<HidrawDevice> device = openSensor(options);
    SignalDescriptor signals;  // before any thread starts
    WakeUp wakeUp;
    device->setDisconnectHandler([&wakeUp](int) { wakeUp.signal(); });
    std::optional<MediaKeyOutput> keys;
    if (options.keys) keys.emplace(options, *holdKey, wakeUp);

    const bool jsonLines = options.format == "jsonl";
    const uint64_t startNs = Util::nanosecondsFromMachTime(Util::hostClock().machTimeNow());
    LiveSession session(device, [&](const HIDEvent& event) {
        // Lines carry the report's arrival time; the text counts from the start of the session.
        const uint64_t timeNs = Util::nanosecondsFromMachTime(event.timestamp());
        std::cout << (jsonLines ? eventJSONLine(event, timeNs) : eventTextLine(event, timeNs - std::min(timeNs, startNs)))
                  << std::endl;
        if (keys) keys->handle(event);
    });
    std::cerr << format("Running on %s (%s); SIGINT or SIGTERM end%s\n", device->path(), device->identity().name,
                        options.recordPath.empty() ? "" : ", SIGUSR1 saves the recording");

    const auto saveRecordingNow = [&] {
        if (options.recordPath.empty()) return;
        try {
            saveRecording(session.host(), options.recordPath);
        } catch (const std::runtime_error& error) {
            std::cerr << error.what() << '\n';  // the session goes on
        }
    };
    const SessionEnd end = waitForEnd(signals, wakeUp, *device, keys ? &*keys : nullptr, saveRecordingNow);

    session.finishEvents();
    if (!options.recordPath.empty()) saveRecording(session.host(), options.recordPath);
    if (end == SessionEnd::SensorLost) {
        throw RunError(format("Lost the sensor at %s: %s", device->path(), std::strerror(device->disconnectError())));
    }
}

}  // namespace

void addRunCommand(CLI::App& app) {
    auto options = std::make_shared<RunOptions>();
    auto* run = app.add_subcommand("run", "Run the plug-in on a sensor behind hidraw and print its gestures live");
    run->footer(
        "The sensor is the one hidraw device with the ZeltoTouch vendor and product IDs unless --device or --match\n"
        "says otherwise. SIGINT or SIGTERM end the session; SIGUSR1 saves the recording (with --record).");
    auto* device = run->add_option("--device", options->devicePath, "The sensor's hidraw node, e.g. /dev/hidraw3");
    addMatchOption(*run, options->match, "Use the hidraw device with these IDs, VENDOR:PRODUCT in hex")->excludes(device);
    run->add_option("--format", options->format, "Event lines: text (readable) or jsonl (one JSON object each)")
        ->check(CLI::IsMember({"text", "jsonl"}))
        ->capture_default_str();
    run->add_option("--record", options->recordPath, "Save the recording (JSON) to this file on exit and on SIGUSR1");
    run->add_flag("--keys", options->keys, "Send the gestures on as media keys through uinput");
    run->add_option("--hold-key", options->holdKey, "With --keys: the key a hold on play/pause sends")
        ->capture_default_str();
    run->add_option("--repeat-interval", options->repeatIntervalMs,
                    "With --keys: milliseconds between repeats of a held volume key")
        ->check(CLI::Range(20u, 10000u))
        ->capture_default_str();
    run->add_option("--log-level", options->logLevel,
                    "Log to stderr from this level on: debug, default, error or off (default: $ZELTO_TOUCH_LOG, else "
                    "error)")
        ->check(CLI::IsMember({"debug", "default", "error", "off"}));
    // Stand-ins, for tests and unusual systems.
    run->add_option("--uinput", options->uinputPath, "The uinput device")->group("")->capture_default_str();
    run->add_option("--sysfs", options->sysfsRoot, "Where sysfs is mounted")->group("");
    run->add_option("--stand-in-fd", options->standInFd,
                    "Read reports from this inherited descriptor (one report per read) instead of a hidraw node")
        ->group("")
        ->excludes(device);

    run->callback([options] { runCommand([&] { runSession(*options); }); });
}

}  // namespace ZeltoTouch::Tools
