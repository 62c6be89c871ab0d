#include "foundation/thread.h"

#include <utility>

namespace lumo {

Thread::~Thread() {
  if (thread_.joinable()) thread_.detach();
}

bool Thread::Start(std::function<void()> body) {
  try {
    if (thread_.joinable()) thread_.detach();
    thread_ = std::thread(std::move(body));
    return true;
  } catch (...) {
    return false;
  }
}

void SimpleThread::SetRunning() {
  running_ = true;
  phase_ = 1;
  phase_.notify_all();
}

void SimpleThread::End() {
  running_ = false;
  phase_ = 2;
  phase_.notify_all();
}

void SimpleThread::WaitRunning() const {
  phase_.wait(0);
}

void SimpleThread::WaitEnded() const {
  for (unsigned phase = phase_; phase != 2; phase = phase_) phase_.wait(phase);
}

bool StartThread(const SimpleThreadPtr& thread) {
  return Thread().Start([thread] {
    thread->Run();
    thread->End();
  });
}

}  // namespace lumo
