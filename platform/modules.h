#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "platform/export.h"
#include "platform/status.h"

namespace platform {

// What is known of a class that others find by its name. Each layer derives its own kind and adds the operations that
// it asks of such classes, as function members that are empty where a class does not offer them.
class ACCOUNT_EXPORT ClassInfo {
 public:
  explicit ClassInfo(std::string name) : _name{std::move(name)} {}
  ClassInfo(const ClassInfo&) = default;
  ClassInfo(ClassInfo&&) = default;
  ClassInfo& operator=(const ClassInfo&) = default;
  ClassInfo& operator=(ClassInfo&&) = default;
  virtual ~ClassInfo();

  [[nodiscard]] const std::string& name() const { return _name; }

 private:
  std::string _name;
};

// Finds a class of the running process by its name.
class ClassRegistry {
 public:
  virtual ~ClassRegistry() = default;

  // Null where no opened module defines a class of that name. Of two classes with one name the later one is found. The
  // information lives as long as the module that registered it.
  [[nodiscard]] virtual const ClassInfo* classNamed(std::string_view name) const = 0;
};

// Registers a class for as long as this object lives. A module holds one, at namespace scope, for each class that it
// defines, so opening the module fills the process's table. Safe from any thread.
class ACCOUNT_EXPORT ClassRegistration {
 public:
  explicit ClassRegistration(std::shared_ptr<const ClassInfo> info);
  ClassRegistration(const ClassRegistration&) = delete;
  ClassRegistration& operator=(const ClassRegistration&) = delete;
  ~ClassRegistration();

 private:
  std::shared_ptr<const ClassInfo> _info;
};

// The registry over the process's one table.
[[nodiscard]] ACCOUNT_EXPORT std::unique_ptr<ClassRegistry> makeProcessClassRegistry();

// Opens loadable modules. A module stays open for the life of the process; opening it again is cheap and does nothing.
class ModuleLoader {
 public:
  virtual ~ModuleLoader() = default;
  // Opens the module at the path with all its symbols resolved at once. The reason of a failure names the path.
  virtual Status open(const std::string& path) = 0;
};

}  // namespace platform
