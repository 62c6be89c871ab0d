#pragma once

#include "commands/xml.h"

namespace lumo {

/// Gives a tree as an XML document on one line. Throws for a name that XML does not allow.
String WriteTree(const XMLDocumentRoot& root);

}  // namespace lumo
