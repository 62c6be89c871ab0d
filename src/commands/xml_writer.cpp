#include "commands/plain_xml.h"
#include "commands/xml_engine.h"

namespace lumo {

XMLElement* XMLElement::AddChild(const String& childName) {
  const XMLElementPtr child(new XMLElement(childName));
  children.PushBack(child);
  return child.Get();
}

String XMLSimpleWriter::Write(const XMLDocumentRoot& root) {
  ClearErrorState();
  String document;
  if (WritePlainXml(root, document)) return document;
  XmlEngine* const engine = GetXmlEngine();
  if (engine != nullptr && engine->Write(root, document)) return document;
  SetErrorState(ObjectErrorIO());
  return {};
}

}  // namespace lumo
