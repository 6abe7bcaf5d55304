#pragma once

#include <asio/executor_work_guard.hpp>
#include <asio/io_context.hpp>
#include <functional>
#include <memory>
#include <string>
#include <thread>

#include "Host/HIDServicePlugIn.h"

namespace ZeltoTouch::Platform {

// A serial queue: tasks submitted with async run one after another, in submission order, on
// the queue's own thread. Shared by reference count; the last holder's release lets the tasks
// already submitted run and then ends the thread: joining it, or, when the last reference goes
// away inside one of the queue's own tasks, letting it finish on its own.
// A task that throws is logged at error level and the queue goes on with the next one.
class DispatchQueue : public std::enable_shared_from_this<DispatchQueue> {
public:
    using Task = std::function<void()>;

    static std::shared_ptr<DispatchQueue> create(std::string label);
    ~DispatchQueue();

    DispatchQueue(const DispatchQueue&) = delete;
    DispatchQueue& operator=(const DispatchQueue&) = delete;

    const std::string& label() const noexcept { return _worker->label; }

    void async(Task task);
    // Runs task on the queue after everything submitted before it and waits for it; on the
    // queue's own thread it runs task at once.
    void sync(const Task& task);
    // Waits until every task submitted before has run.
    void barrier() { sync([] {}); }
    bool isCurrent() const noexcept { return std::this_thread::get_id() == _thread.get_id(); }

    // The opaque host-boundary handle for this queue, and back. fromHandle returns a new owning
    // reference; the handle is valid while some owner keeps the queue alive.
    ZeltoDispatchQueue* handle() noexcept { return reinterpret_cast<ZeltoDispatchQueue*>(this); }
    static std::shared_ptr<DispatchQueue> fromHandle(ZeltoDispatchQueue* handle);

private:
    // What the thread needs; the thread holds it too, so it may outlive the queue object.
    struct Worker {
        explicit Worker(std::string label) : label(std::move(label)) {}
        const std::string label;
        asio::io_context io;
        void runTask(const Task& task) const noexcept;
    };

    explicit DispatchQueue(std::string label);

    std::shared_ptr<Worker> _worker;
    asio::executor_work_guard<asio::io_context::executor_type> _work;
    std::thread _thread;
};

}  // namespace ZeltoTouch::Platform
