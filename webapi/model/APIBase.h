#pragma once

#include <json/json.h>

#include <string>
#include <string_view>

namespace QELO {

/// The state of a record as one JSON object of named sections, so that a whole record can be
/// handed to another process as text.
///
/// A section is made by InitField() or a derived constructor, never by setting a key. Nothing
/// here throws, whatever a deserialized store holds: a section that is no object has no keys and,
/// unless it is null, refuses to be given one.
class APIBase {
 public:
  APIBase();
  APIBase(const APIBase&) = default;
  APIBase& operator=(const APIBase&) = default;

  virtual ~APIBase();
  virtual bool HasData(const std::string& section, const std::string& key) const;
  /// Merges the members of an object into a section.
  /// @param stringOnly  members that are no strings are left out
  /// @return false when there is no such section or `members` is no object or an empty one; true
  ///         also when every member was left out
  virtual bool SetData(const std::string& section, const Json::Value& members, bool stringOnly);
  /// @return false, and nothing changes, without such a section, with an empty key, or when
  ///         `stringOnly` is asked and `value` is no string
  virtual bool SetData(const std::string& section, const std::string& key, const Json::Value& value,
                       bool stringOnly);
  /// The member `key`, or the whole section when `key` is empty, or `defaultValue` itself, which
  /// must outlive the result.
  virtual const Json::Value& GetData(const std::string& section, const std::string& key,
                                     const Json::Value& defaultValue) const;
  /// Removes a member; an empty key empties the section, which stays.
  /// @return false when there is nothing of that name, or the section is neither object nor array
  virtual bool ClearData(const std::string& section, const std::string& key);
  /// The whole section, or `defaultValue` itself.
  virtual const Json::Value& GetData(const std::string& section,
                                     const Json::Value& defaultValue) const;

  /// Creates an empty section. @return false when the name is empty or taken
  bool InitField(const std::string& section);
  /// The whole store; may be changed in place.
  Json::Value& Serialize() { return store_; }
  /// Swaps the store with `record`, unchecked.
  void Deserialize(Json::Value& record) { store_.swap(record); }

  /// As SetData() with the members of an object, which are moved where that is possible.
  bool TakeData(const std::string& section, Json::Value&& members, bool stringOnly);
  /// As ClearData() and then TakeData().
  bool ReplaceData(const std::string& section, Json::Value&& members);
  /// As SetData() with a name that lives as long as the process.
  bool Put(std::string_view section, const char* key, Json::Value value);

 protected:
  /// The member, or null when it or the section is missing.
  const Json::Value* Find(std::string_view section, std::string_view key) const;
  /// The section as something that takes members, or null.
  Json::Value* FindSection(std::string_view section);
  /// Creates an empty section that is not there yet; its name lives as long as the process.
  void AddSection(const char* section);

  Json::Value store_;
};

}  // namespace QELO
