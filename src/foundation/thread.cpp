#include "foundation/thread.h"

#include <utility>

#include "foundation/fault.h"
#include "foundation/thread_roll.h"
#include "foundation/thrown.h"
#include "platform/memory_shortage.h"

namespace lumo {
namespace {

/// Runs the body of a thread. An exception ends there, and with it the thread, not the process.
void RunGuarded(std::function<void()>& body) {
  try {
    body();
  } catch (...) {
    // Whoever waits for the thread's work sees that it isn't done; nobody else waits for it.
    NoteException();
  }
  body = nullptr;  // lets go of what it holds before the thread leaves
}

}  // namespace

Thread::~Thread() {
  if (thread_.joinable()) ThreadRoll::Get().Keep(std::move(thread_));
}

bool Thread::Start(std::function<void()> body) {
  try {
    if (thread_.joinable()) ThreadRoll::Get().Keep(std::move(thread_));
    thread_ = std::thread([body = std::move(body)]() mutable {
      RunGuarded(body);
      ThreadRoll::Get().Leave();
    });
    return true;
  } catch (...) {
    platform::NoteMemoryShortage();  // which a thread takes
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
    try {
      thread->Run();
    } catch (...) {
      NoteException();  // it ends as one whose Run has returned
    }
    thread->End();
  });
}

}  // namespace lumo
