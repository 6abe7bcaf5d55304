#include "Platform/DispatchQueue.h"

#include <asio/post.hpp>
#include <exception>

#include "Platform/Semaphore.h"
#include "Platform/Thread.h"
#include "Shared/Util/Log.h"

namespace ZeltoTouch::Platform {

std::shared_ptr<DispatchQueue> DispatchQueue::create(std::string label) {
    return std::shared_ptr<DispatchQueue>(new DispatchQueue(std::move(label)));
}

DispatchQueue::DispatchQueue(std::string label)
    : _worker(std::make_shared<Worker>(std::move(label))),
      _work(asio::make_work_guard(_worker->io)),
      _thread([worker = _worker] {
          setCurrentThreadName(worker->label);
          worker->io.run();
      }) {}

DispatchQueue::~DispatchQueue() {
    _work.reset();  // run() returns once the submitted tasks are done
    if (isCurrent()) {
        _thread.detach();
    } else {
        _thread.join();
    }
}

void DispatchQueue::async(Task task) {
    asio::post(_worker->io, [worker = _worker.get(), task = std::move(task)] { worker->runTask(task); });
}

void DispatchQueue::sync(const Task& task) {
    if (isCurrent()) {
        _worker->runTask(task);
        return;
    }
    Semaphore done;
    async([&] {
        _worker->runTask(task);
        done.signal();
    });
    done.wait();
}

std::shared_ptr<DispatchQueue> DispatchQueue::fromHandle(ZeltoDispatchQueue* handle) {
    if (handle == nullptr) return nullptr;
    return reinterpret_cast<DispatchQueue*>(handle)->shared_from_this();
}

void DispatchQueue::Worker::runTask(const Task& task) const noexcept {
    try {
        task();
    } catch (const std::exception& error) {
        Log("DispatchQueue").error("Task on queue %s threw: %s", label, error.what());
    } catch (...) {
        Log("DispatchQueue").error("Task on queue %s threw a non-standard exception", label);
    }
}

}  // namespace ZeltoTouch::Platform
