#include "platform/browser.h"

#include <cstdlib>
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

namespace lumo::platform {
namespace {

bool Has(const char* variable) {
  const char* const value = std::getenv(variable);
  return value != nullptr && *value != 0;
}

}  // namespace

bool OpenInBrowser(const std::string& address) {
  const bool isNamed = Has("BROWSER");
  if (!isNamed && !Has("DISPLAY") && !Has("WAYLAND_DISPLAY")) return false;
  // A shell in between ends at once, so that nobody has to wait for the browser. The address is an
  // argument, and no part of what the shell reads.
  const char* const script = isNamed ? "$BROWSER \"$0\" &" : "xdg-open \"$0\" &";
  const char* const arguments[] = {"sh", "-c", script, address.c_str(), nullptr};
  posix_spawn_file_actions_t actions;
  if (posix_spawn_file_actions_init(&actions) != 0) return false;
  for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    posix_spawn_file_actions_addopen(&actions, stream, "/dev/null", O_RDWR, 0);
  }
  pid_t child = -1;
  const int fault =
      posix_spawnp(&child, "sh", &actions, nullptr, const_cast<char* const*>(arguments), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (fault != 0) return false;
  int status = 0;
  return waitpid(child, &status, 0) == child && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

}  // namespace lumo::platform
