#pragma once

#include <map>
#include <set>

#include "commands/catalog_session.h"

// Keeps who has opened what, beside the catalog's own counts. For the catalog's sources only;
// everything is called under the lock of the catalog.

namespace lumo::catalog {

/// Opens of one object by session; those that the catalog counts beyond them are nobody's.
using Owners = std::map<const Session*, unsigned>;

std::map<URI, Owners>& AllOwners();

/// Objects that aborted jobs opened, and that nobody has closed since.
std::set<URI>& Unfinished();

/// Notes one more open of this thread's session.
void NoteOpen(const URI& uri);

/// Notes that one open goes.
/// @param count  opens that the catalog counts before.
void NoteClose(const URI& uri, unsigned count);

}  // namespace lumo::catalog
