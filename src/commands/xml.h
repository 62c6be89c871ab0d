#pragma once

#include "foundation/containers.h"
#include "foundation/pointer.h"

namespace lumo {

/// Limits on the documents that are parsed. A document beyond them counts as not well formed.
inline constexpr unsigned kMaxXMLBytes = 64U << 20;   ///< of the document
inline constexpr unsigned kMaxXMLDepth = 1000;        ///< elements inside one another
inline constexpr unsigned kMaxXMLAttributes = 10000;  ///< of one element

/// Reads an XML document and hands its events to the operations that a derived class overrides.
///
/// A document with a DOCTYPE is refused before anything in it is expanded, and nothing outside the
/// document is ever opened.
/// Failure: ObjectErrorIO for an empty text, one that is not well formed or one beyond the limits.
///          Events before the fault have had their effect.
/// Threads: used by one thread.
class VEXG_EXPORT XMLSimpleParser : public ErrorState {
 public:
  /// Called before the first element.
  virtual void StartDocument() {}
  /// Called behind the last element; not for a document that breaks off.
  virtual void EndDocument() {}
  /// Called where an element begins.
  virtual void StartElement(const String& /*name*/, const Map<String, String>& /*attributes*/) {}
  /// Called where an element ends.
  virtual void EndElement(const String& /*name*/) {}
  /// Called with text of the element that is open, which may come in several parts.
  virtual void Characters(const String& /*text*/) {}

  /// Reads a document and calls the operations in its order.
  void Parse(const String& document);

  /// The fault of the document and its place, in one line; empty when there was none.
  const String& GetFault() const { return fault_; }

 private:
  void SetFault(const String& fault);

  String fault_;
};

class XMLElement;
using XMLElementPtr = Pointer<XMLElement>;

/// A node of an XML tree: name, attributes, text and children in order.
class VEXG_EXPORT XMLElement {
 public:
  using PointerRoot = XMLElement;

  explicit XMLElement(const String& elementName) : name(elementName) {}
  virtual ~XMLElement() = default;

  /// Adds a child at the end; this element owns it.
  XMLElement* AddChild(const String& childName);

  String name;                     ///< has to be one that XML allows
  Map<String, String> attributes;  ///< written in the order of their names
  String text;                     ///< written when its length is not 0
  Deque<XMLElementPtr> children;
};

/// The root of a document to write; it has no text.
struct XMLDocumentRoot {
  String name;
  Deque<XMLElementPtr> children;
  Map<String, String> attributes;  ///< none in the documents that have always been written
};

/// Writes a tree as an XML document in UTF-8, on one line. A character that XML can't carry is
/// written as U+FFFD.
/// Failure: ObjectErrorIO and an empty text, for a name that XML does not allow among others.
/// Threads: used by one thread.
class VEXG_EXPORT XMLSimpleWriter : public ErrorState {
 public:
  /// Writes a document; an empty text on a failure.
  String Write(const XMLDocumentRoot& root);
};

}  // namespace lumo
