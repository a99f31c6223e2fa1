#pragma once

#include <sys/types.h>

#include <chrono>
#include <functional>

namespace tests {

// A forked process that runs the task and ends; it is killed and reaped when this object goes.
class ChildProcess {
 public:
  // `say` sends the parent one sign of life.
  using Task = std::function<void(const std::function<void()>& say)>;

  explicit ChildProcess(const Task& task);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  ~ChildProcess();

  // Whether the child said something, or ends saying it, within the time.
  [[nodiscard]] bool says(std::chrono::milliseconds within) const;
  void kill();

 private:
  pid_t _process = -1;
  int _words = -1;
};

}  // namespace tests
