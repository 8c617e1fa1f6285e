#include "platform/LogFormat.h"

#include <algorithm>

namespace platform {
namespace {

constexpr std::string_view kNothing = "(null)";

// The longest conversion that `rest`, which begins with "%", begins with; empty when it is none.
std::string_view conversionAtStart(std::string_view rest) {
  for (const std::string_view conversion : {"%@", "%s", "%d", "%ld", "%%"})
    if (rest.starts_with(conversion)) return conversion;
  return {};
}

std::string converted(std::string_view conversion, const LogArgument& argument, std::size_t limit) {
  if (conversion == "%d") return std::to_string(static_cast<std::int32_t>(argument.number()));
  if (conversion == "%ld") return std::to_string(argument.number());
  return argument.text(limit);
}

}  // namespace

LogArgument::LogArgument(std::string_view text) : _form(Form::text), _text(text) {}

LogArgument::LogArgument(const char* text) {
  if (text != nullptr) *this = std::string_view(text);
}

LogArgument::LogArgument(const std::optional<std::string>& text) {
  if (text) *this = std::string_view(*text);
}

LogArgument::LogArgument(int number) : _form(Form::number), _number(number) {}

LogArgument::LogArgument(long number) : _form(Form::number), _number(number) {}

LogArgument::LogArgument(long long number) : _form(Form::number), _number(number) {}

LogArgument::LogArgument(unsigned number) : _form(Form::number), _number(number) {}

LogArgument::LogArgument(unsigned long number)
    : _form(Form::unsignedNumber), _number(static_cast<std::int64_t>(number)) {}

LogArgument::LogArgument(const propertylist::Value& value)
    : _form(Form::value), _referent(&value) {}

LogArgument::LogArgument(const propertylist::Value* value) {
  if (value != nullptr) *this = *value;
}

LogArgument::LogArgument(const propertylist::Dictionary& dictionary)
    : _form(Form::dictionary), _referent(&dictionary) {}

LogArgument::LogArgument(const propertylist::Array& array)
    : _form(Form::array), _referent(&array) {}

LogArgument::LogArgument(const std::optional<propertylist::Dictionary>& dictionary) {
  if (dictionary) *this = *dictionary;
}

LogArgument::LogArgument(const std::optional<propertylist::Array>& array) {
  if (array) *this = *array;
}

LogArgument::LogArgument(const std::optional<Error>& error) {
  if (error) *this = error->description;
}

LogArgument::LogArgument(const Describable& object) : _form(Form::object), _referent(&object) {}

LogArgument::LogArgument(const Describable* object) {
  if (object != nullptr) *this = *object;
}

std::string LogArgument::text(std::size_t limit) const {
  switch (_form) {
    case Form::text:
      return propertylist::shortened(_text, limit);
    case Form::number:
      return std::to_string(_number);
    case Form::unsignedNumber:
      return std::to_string(static_cast<std::uint64_t>(_number));
    case Form::value:
      return propertylist::describe(*static_cast<const propertylist::Value*>(_referent), limit);
    case Form::dictionary:
      return propertylist::describe(*static_cast<const propertylist::Dictionary*>(_referent),
                                    limit);
    case Form::array:
      return propertylist::describe(*static_cast<const propertylist::Array*>(_referent), limit);
    case Form::object:
      return propertylist::shortened(static_cast<const Describable*>(_referent)->description(),
                                     limit);
    case Form::none:
      break;
  }
  return std::string(kNothing);
}

std::int64_t LogArgument::number() const { return _number; }

std::string formatLogLine(std::string_view format, std::initializer_list<LogArgument> arguments,
                          std::size_t limit) {
  std::string line;
  const LogArgument* next = arguments.begin();
  while (!format.empty()) {
    const std::size_t plain = std::min(format.find('%'), format.size());
    line.append(format.substr(0, plain));
    format.remove_prefix(plain);
    if (format.empty()) break;
    const std::string_view conversion = conversionAtStart(format);
    if (conversion.empty() || conversion == "%%")
      line += '%';
    else if (next == arguments.end())
      line += kNothing;
    else
      line += converted(conversion, *next++, limit);
    format.remove_prefix(conversion.empty() ? 1 : conversion.size());
  }
  return line;
}

}  // namespace platform
