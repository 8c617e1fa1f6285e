#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/Export.h"
#include "platform/Status.h"
#include "propertylist/Value.h"
#include "propertylist/Writing.h"

namespace platform {

// What "%@" prints as the text of its own choice.
class PLATFORM_EXPORT Describable {
 public:
  virtual ~Describable();
  virtual std::string description() const = 0;
};

// One argument of a log line. Refers to what it was made from, which must outlive the call that
// takes it, and describes it only when a line is really written.
class PLATFORM_EXPORT LogArgument {
 public:
  // NOLINTBEGIN(google-explicit-constructor): arguments are passed as they are
  LogArgument(std::string_view text);
  LogArgument(const std::string& text) : LogArgument(std::string_view(text)) {}
  LogArgument(const char* text);                        // null prints as "(null)"
  LogArgument(const std::optional<std::string>& text);  // empty prints as "(null)"
  LogArgument(const std::optional<propertylist::Text>& text)
      : LogArgument(text ? LogArgument(std::string_view(*text))
                         : LogArgument(static_cast<const char*>(nullptr))) {}
  LogArgument(int number);
  LogArgument(long number);
  LogArgument(long long number);
  LogArgument(unsigned number);
  LogArgument(unsigned long number);
  LogArgument(const propertylist::Value& value);
  LogArgument(const propertylist::Value* value);  // null prints as "(null)"
  LogArgument(const propertylist::Dictionary& dictionary);
  LogArgument(const propertylist::Array& array);
  LogArgument(const std::optional<propertylist::Dictionary>& dictionary);
  LogArgument(const std::optional<propertylist::Array>& array);
  LogArgument(const std::optional<Error>& error);  // empty prints as "(null)"
  LogArgument(const Describable& object);
  LogArgument(const Describable* object);  // null prints as "(null)"
  template <typename T>
  LogArgument(const std::shared_ptr<T>& object)
      : LogArgument(static_cast<const Describable*>(object.get())) {}
  // NOLINTEND(google-explicit-constructor)

  // The argument's text, as "%@" and "%s" print it; cut as by propertylist::shortened when it has
  // more than `limit` bytes.
  std::string text(std::size_t limit = propertylist::kMaximumDescription) const;
  // The argument as a number for "%d" and "%ld": 0 when it is none.
  std::int64_t number() const;

 private:
  enum class Form { text, number, unsignedNumber, value, dictionary, array, object, none };
  Form _form = Form::none;
  std::string_view _text;
  std::int64_t _number = 0;
  const void* _referent = nullptr;
};

// Expands `format`: "%@" and "%s" print an argument's text, "%d" (32 bits) and "%ld" (64 bits) its
// number, "%%" a percent sign; any other "%" stands for itself. Arguments left over are ignored; a
// missing one prints as "(null)". A "%" inside an argument is never interpreted. An argument of
// more than `limit` bytes is cut there, at the end of a character, and "..." is put behind it.
PLATFORM_EXPORT std::string formatLogLine(std::string_view format,
                                          std::initializer_list<LogArgument> arguments,
                                          std::size_t limit = propertylist::kMaximumDescription);

}  // namespace platform
