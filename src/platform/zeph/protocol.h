// SPDX-License-Identifier: MIT
// What two processes may call on each other: one row per member.
#pragma once

#include <initializer_list>
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include "platform/base/value.h"

namespace brivo::zeph {

/// The object that every connection serves.
inline constexpr const char* kObjectPath = "/org/orvid/brivod";

/// One member of a protocol. The strings are constants of the program. *Immutable.*
struct Member {
  enum class Kind {
    method,  ///< called by the client, answered by the service
    signal,  ///< sent by the service to one client, never answered
  };
  enum class Serving { served, declaredOnly };

  /// Such as "openDevice:withReply:".
  std::string_view selector;
  Kind kind;
  /// D-Bus signatures of the arguments and of the answer.
  const char* in;
  const char* out;
  /// The arguments' names, then the answer's, each followed by a comma.
  std::string_view names;
  Serving serving = Serving::served;

  /// The selector without its last colon, inner colons written "_".
  std::string dbusName() const;
  /// The same without making a string.
  bool hasDBusName(std::string_view name) const;
};

/// A D-Bus interface and its members. Lives as long as the program.
struct Protocol {
  const char* interface;
  std::span<const Member> members;

  const Member* withSelector(std::string_view selector) const;
  const Member* withDBusName(std::string_view name) const;
};

/// A set of value classes.
class ClassSet {
 public:
  ClassSet(std::initializer_list<Value::Class> classes) {
    for (const Value::Class one : classes) bits_ |= 1U << static_cast<unsigned>(one);
  }
  bool contains(Value::Class one) const { return (bits_ >> static_cast<unsigned>(one) & 1U) != 0; }
  /// True when `value` and everything in it is of one of the classes.
  bool admits(const Value& value) const;

 private:
  unsigned bits_ = 0;
};

/// A protocol as one side of a connection uses it, with the classes it accepts for single
/// arguments. *Thread-bound* until it is given to a connection.
class Interface {
 public:
  enum class Origin { argument, reply };

  explicit Interface(const Protocol& protocol) : protocol_(&protocol) {}

  const Protocol& protocol() const { return *protocol_; }

  /// Restricts argument 0 of the selector's call or of its reply to `classes`.
  void setClasses(const ClassSet& classes, std::string_view selector, Origin origin);
  /// True when the restriction, if there is one, admits `value`.
  bool admits(const Value& value, std::string_view selector, Origin origin) const;

 private:
  const Protocol* protocol_;
  std::map<std::pair<std::string_view, Origin>, ClassSet> classes_;
};

}  // namespace brivo::zeph
