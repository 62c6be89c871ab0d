#pragma once

#include <set>
#include <vector>

#include "foundation/string.h"

namespace lumo::catalog {

/// The opens of one client in the catalog. Objects that a thread adds while a SessionScope of it
/// lives, and those of all threads of a job that such a thread runs, count as the client's.
///
/// Where a client closes what another one has opened, one of its own opens goes first, then one
/// that is nobody's, then another client's. Threads: any. It outlives its scopes.
class VEXG_EXPORT Session {
 public:
  /// @param client  number of the client's process.
  explicit Session(int client) : client_(client) {}
  /// Leaves the objects that are still open to nobody.
  ~Session();
  Session(const Session&) = delete;
  Session& operator=(const Session&) = delete;

  /// Number of the client's process.
  int GetClient() const { return client_; }

  /// Closes all that the client has opened and not closed. New sources that a job of its had opened
  /// which was aborted are not put in their places: they may not be whole.
  void ReleaseAll();

  /// Begins the job whose opens EndJob ends.
  void BeginJob();
  /// Ends the job that BeginJob began.
  /// @param isAborted  new sources that the job opened, and that nobody closes, are given up in the
  ///                   end.
  void EndJob(bool isAborted);

 private:
  friend void NoteOpen(const URI& uri);

  const int client_;
  std::set<URI> opensOfJob_;  // under the lock of the catalog
};

/// While one lives, the opens of this thread are those of a session; null for nobody's.
class VEXG_EXPORT SessionScope {
 public:
  explicit SessionScope(Session* session);
  ~SessionScope();
  SessionScope(const SessionScope&) = delete;
  SessionScope& operator=(const SessionScope&) = delete;

 private:
  Session* before_;
};

/// The session of this thread; null for none.
VEXG_EXPORT Session* CurrentSession();

/// The opens of one object that belong to one client.
struct OpenObject {
  URI uri;             ///< its key in the catalog
  unsigned opens = 0;  ///< how often the client has opened and not closed it
  int client = 0;      ///< number of its process; 0 for nobody's
};

/// All that is open, by whom, in the order of the identifiers.
VEXG_EXPORT std::vector<OpenObject> ListOpenObjects();

/// Closes everything, whoever opened it, for the end of a program. What aborted jobs left open is
/// given up.
/// @return the fault texts of sources that could not be finished.
VEXG_EXPORT std::vector<String> Empty();

}  // namespace lumo::catalog
