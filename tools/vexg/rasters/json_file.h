#pragma once

#include <initializer_list>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "foundation/color.h"
#include "output/json_number.h"

namespace lumo::host {

/// A JSON file that a user has written, whose parts know the line that they stand in.
///
///     const JsonFile file("rules.json");
///     const JsonField name = file.GetRoot().Get("classes").List()[0].Get("name");
///     if (name.Text().empty()) name.Refuse("a name is wanted");  // rules.json: line 3: classes...
class JsonFile;

/// A part of a JSON file. Throws HostError, which names the file, the line and the part, where it
/// isn't what is asked for.
class JsonField {
 public:
  [[noreturn]] void Refuse(const std::string& why) const;

  bool Has(const char* name) const { return json_->is_object() && json_->contains(name); }
  JsonField Get(const char* name) const;
  /// All members of an object, with their names.
  std::vector<std::pair<std::string, JsonField>> Members() const;
  /// The elements of a list, which has one at least.
  std::vector<JsonField> List() const;
  std::string Text() const;
  bool Flag() const;
  double Number() const;
  /// A whole number within bounds.
  unsigned Whole(unsigned least, unsigned most) const;
  double NumberOr(const char* name, double otherwise) const {
    return Has(name) ? Get(name).Number() : otherwise;
  }
  std::string TextOr(const char* name, const std::string& otherwise) const {
    return Has(name) ? Get(name).Text() : otherwise;
  }
  bool FlagOr(const char* name, bool otherwise) const {
    return Has(name) ? Get(name).Flag() : otherwise;
  }
  /// A text that is one of some words.
  std::string OneOf(std::initializer_list<const char*> words) const;
  /// A colour, as #rrggbb or by its name.
  Color AsColor() const;

  /// Refuses members that mean nothing.
  void Allow(std::initializer_list<const char*> names) const;

  const Json& GetJson() const { return *json_; }
  /// How messages call it: with the file and the line.
  std::string Where() const;

 private:
  friend class JsonFile;
  struct Source {
    std::string name;
    std::string text;
    Json json;
  };
  /// A step from a value into it.
  struct Step {
    std::string name;
    std::size_t index = 0;
    bool isIndex = false;
  };

  JsonField(std::shared_ptr<const Source> source, const Json& json, std::vector<Step> steps)
      : source_(std::move(source)), json_(&json), steps_(std::move(steps)) {}
  JsonField Below(const Json& json, Step step) const;

  std::shared_ptr<const Source> source_;
  const Json* json_;  // in the source
  std::vector<Step> steps_;
};

class JsonFile {
 public:
  /// Reads the file, or standard input for "-". Throws HostError where it can't be read or is no
  /// JSON.
  explicit JsonFile(const std::string& file);

  JsonField GetRoot() const { return {source_, source_->json, {}}; }

 private:
  std::shared_ptr<const JsonField::Source> source_;
};

}  // namespace lumo::host
