#include "commands/catalog_session.h"

#include <iterator>
#include <numeric>

#include "commands/catalog.h"
#include "commands/catalog_owners.h"
#include "foundation/abandonment.h"
#include "foundation/fault.h"

namespace lumo::catalog {
namespace {

thread_local Session* tSession = nullptr;

unsigned OwnedOpens(const Owners& owners) {
  return std::accumulate(owners.begin(), owners.end(), 0U,
                         [](unsigned sum, const auto& owner) { return sum + owner.second; });
}

/// Takes the session out of all objects, and gives those that it had open, once for each open.
std::vector<URI> Forget(const Session& session) {
  std::vector<URI> opens;
  for (auto at = AllOwners().begin(); at != AllOwners().end();) {
    const auto mine = at->second.find(&session);
    if (mine != at->second.end()) {
      opens.insert(opens.end(), mine->second, at->first);
      at->second.erase(mine);
    }
    at = at->second.empty() ? AllOwners().erase(at) : std::next(at);
  }
  return opens;
}

bool IsUnfinished(const URI& uri) {
  const MutexLock lock = GetGlobalDataMap().Lock();
  return Unfinished().contains(uri);
}

}  // namespace

std::map<URI, Owners>& AllOwners() {
  static auto& owners = *new std::map<URI, Owners>;
  return owners;
}

std::set<URI>& Unfinished() {
  static auto& unfinished = *new std::set<URI>;
  return unfinished;
}

void NoteOpen(const URI& uri) {
  if (tSession == nullptr) return;
  ++AllOwners()[uri][tSession];
  tSession->opensOfJob_.insert(uri);
}

void NoteClose(const URI& uri, unsigned count) {
  const auto at = AllOwners().find(uri);
  if (at == AllOwners().end()) return;
  Owners& owners = at->second;
  auto owner = owners.find(tSession);
  if (owner == owners.end() && OwnedOpens(owners) < count) return;  // it was nobody's
  if (owner == owners.end()) owner = owners.begin();
  if (--owner->second == 0) owners.erase(owner);
  if (owners.empty()) AllOwners().erase(at);
}

Session::~Session() {
  const MutexLock lock = GetGlobalDataMap().Lock();
  Forget(*this);
}

void Session::ReleaseAll() {
  std::vector<URI> opens;
  {
    const MutexLock lock = GetGlobalDataMap().Lock();
    opens = Forget(*this);
  }
  // They count as nobody's now.
  for (const URI& uri : opens) {
    const AbandonScope abandonment(IsUnfinished(uri));
    Release(uri);
  }
}

void Session::BeginJob() {
  const MutexLock lock = GetGlobalDataMap().Lock();
  opensOfJob_.clear();
}

void Session::EndJob(bool isAborted) {
  auto& map = GetGlobalDataMap();
  const MutexLock lock = map.Lock();
  for (const URI& uri : opensOfJob_) {
    if (isAborted && map.HasKey(uri)) Unfinished().insert(uri);
  }
  opensOfJob_.clear();
}

SessionScope::SessionScope(Session* session) : before_(tSession) {
  tSession = session;
}

SessionScope::~SessionScope() {
  tSession = before_;
}

Session* CurrentSession() {
  return tSession;
}

std::vector<OpenObject> ListOpenObjects() {
  std::vector<OpenObject> all;
  auto& map = GetGlobalDataMap();
  const MutexLock lock = map.Lock();
  for (const auto& [uri, entry] : map) {
    const auto at = AllOwners().find(uri);
    const Owners owners = at != AllOwners().end() ? at->second : Owners();
    for (const auto& [session, opens] : owners) all.push_back({uri, opens, session->GetClient()});
    const unsigned owned = OwnedOpens(owners);
    if (owned < entry.count) all.push_back({uri, entry.count - owned, 0});
  }
  return all;
}

std::vector<String> Empty() {
  std::vector<String> faults;
  auto& map = GetGlobalDataMap();
  while (true) {
    ObjectPtr last;  // goes after the lock
    bool isUnfinished = false;
    {
      const MutexLock lock = map.Lock();
      if (map.GetCount() == 0) return faults;
      const URI uri = map.begin()->first;
      last = map.begin()->second.object;
      AllOwners().erase(uri);
      isUnfinished = Unfinished().erase(uri) != 0;
      map.Remove(uri);
    }
    TakeFault();
    {
      const AbandonScope abandonment(isUnfinished || IsAbandoning());
      last = ObjectPtr();
    }
    const String fault = TakeFault();
    if (fault.GetLength() != 0 && !isUnfinished) faults.push_back(fault);
  }
}

}  // namespace lumo::catalog
