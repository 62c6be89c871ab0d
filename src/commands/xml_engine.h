#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "commands/xml.h"

namespace lumo {

/// Hears what an XML document holds, in its order, as an engine reads it.
class XmlListener {
 public:
  /// An attribute of an element.
  struct Attribute {
    const char16_t* name;
    const char16_t* value;
  };
  /// How bad a message is.
  enum class Weight { kWarning, kError, kFatal };

  virtual ~XmlListener() = default;
  virtual void OnBegin() {}  ///< Called before the first element.
  virtual void OnEnd() {}    ///< Called behind the last element, unless the document breaks off.
  /// Called where an element begins. False refuses the document.
  virtual bool OnElement(const char16_t* name, const Attribute* attributes, std::size_t count) = 0;
  virtual void OnElementEnd(const char16_t* name) = 0;  ///< Called where an element ends.
  /// Called with text of the open element, which may come in several parts.
  virtual void OnText(const char16_t* units, std::size_t count) = 0;
  /// Called with the value of an entity that the document declares. False refuses the document.
  virtual bool OnEntity(const char16_t* /*value*/) { return true; }
  /// Called with what the engine has to say of the document.
  virtual void OnMessage(Weight weight, std::uint64_t line, std::uint64_t column,
                         const char16_t* text) = 0;
};

/// How a document came out.
struct XmlOutcome {
  enum class Kind {
    kDone,          ///< it was read, and found well formed
    kErrors,        ///< it was read, with errors that the listener heard of
    kDoctype,       ///< it has a DOCTYPE, which this way of reading refuses
    kRefused,       ///< the listener refused it
    kNoMemory,      ///< memory was short, which is noted
    kException,     ///< the XML library gave up, `text` says why
    kSaxException,  ///< it gave up at a place in the document
    kOther          ///< something else was thrown
  };
  Kind kind = Kind::kDone;
  String text;
};

/// Reads and writes XML. It lies in a library of its own, libvexxml.so, which is loaded when XML is
/// first read or written: the XML library and what that needs cost a program without XML nothing.
///
/// Threads: any number. No exception leaves an operation, but those of a listener's own.
class XmlEngine {
 public:
  virtual ~XmlEngine() = default;

  /// Reads a document in UTF-8, whatever its declaration says, refusing any DOCTYPE.
  virtual XmlOutcome ReadPlain(const char* bytes, std::size_t count, XmlListener& listener) = 0;

  /// Reads a document whose own entities count, up to `mostExpansions` times, and nothing outside.
  /// @param name    stands for the document in messages.
  /// @param isUtf8  it is in UTF-8, whatever its declaration says.
  virtual XmlOutcome ReadWithEntities(const char* bytes, std::size_t count, const char* name,
                                      bool isUtf8, unsigned mostExpansions,
                                      XmlListener& listener) = 0;

  /// Reads what an address leads to. One of a file is only taken apart: `path` is its path then.
  /// @param most  bytes beyond this count fail: `bytes` has more then.
  virtual XmlOutcome ReadAddress(const String& address, std::size_t most, std::string& path,
                                 std::string& bytes) = 0;

  /// Writes a tree on one line. False for a name that XML does not allow among others.
  virtual bool Write(const XMLDocumentRoot& root, String& document) = 0;
};

/// The entry point "CreateXmlEngine" of libvexxml.so: gives the engine of the process, null where
/// it can't be made ready.
using CreateXmlEngineFunction = XmlEngine*();

/// The engine, whose library is loaded at the first call; null, with the fault set, without it.
XmlEngine* GetXmlEngine();

}  // namespace lumo
