#pragma once

#include <string>

#include "platform/file_descriptor.h"
#include "platform/message_pipe.h"

// The directory of the pipes and what both ends of a pipe do there. For the sources of this folder
// only.

namespace lumo::platform {

/// Path of the directory of this user's pipes.
std::string PipeDirectory();

/// Opens the directory, which is made first when it is missing. Not open when it isn't a directory
/// of this user's own that nobody else can enter.
FileDescriptor OpenPipeDirectory();

/// Connects a new socket to the one at `path`.
/// @param seconds  how long to wait where the server's queue is full.
/// @return 0, or the system's number for what went wrong.
int ConnectSocket(const std::string& path, double seconds, FileDescriptor& socket);

/// True when the process at the other end belongs to this user.
bool PeerIsOurs(int socket);

/// The process at the other end.
int PeerProcess(int socket);

}  // namespace lumo::platform
