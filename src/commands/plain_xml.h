#pragma once

#include <string_view>

#include "commands/xml.h"

namespace lumo {

// The documents that jobs are made of use little of XML: elements, attributes and texts. These are
// read by Expat and written here, so that a command line or a job needs no large XML library
// (XmlEngine); whatever uses more, or is wrong, goes there.

/// Reads a document of elements, attributes and texts, and hands its events to `target`. False,
/// with nothing handed over, for one that holds anything else or is not well formed.
/// @param document  UTF-8.
VEXG_EXPORT bool ReadPlainXml(std::string_view document, XMLSimpleParser& target);

/// Writes a tree as XmlEngine::Write does. False for one with a character that is written in a way
/// of its own, or a name beyond ASCII.
bool WritePlainXml(const XMLDocumentRoot& root, String& document);

}  // namespace lumo
