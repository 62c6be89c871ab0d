#include "platform/socket_reuse.h"

#include <sys/socket.h>

namespace lumo::platform {

void AllowPortSoon(int socket) {
  const int yes = 1;
  setsockopt(socket, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
}

}  // namespace lumo::platform
