#include <fmt/format.h>
#include <unistd.h>

#include <memory>
#include <optional>
#include <span>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/JsonForm.h"
#include "tools/account-settings/PropertyListInput.h"
#include "tools/common/Files.h"
#include "tools/common/Program.h"

namespace tools {
namespace {

using propertylist::Value;

struct Options {
  std::string file;
  std::string form;
  std::string output;
};

std::span<const std::uint8_t> bytesOf(const std::string& text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

// Empty when the form cannot hold the value.
std::optional<std::string> written(const Value& value, const std::string& form) {
  if (form == "json") return jsonFormText(value);
  if (form == "xml") return propertylist::writeXMLPropertyList(value);
  const auto bytes = propertylist::writeBinaryPropertyList(value);
  if (!bytes) return std::nullopt;
  return std::string(bytes->begin(), bytes->end());
}

ExitCode run(const Options& options) {
  if (options.form == "binary" && options.output.empty() && ::isatty(STDOUT_FILENO) == 1)
    throw CommandFailure(ExitCode::wrongUsage,
                         "the binary form is not for terminals; give --output FILE");
  const Value value = readPropertyListOfAnyForm(options.file);
  const std::optional<std::string> text = written(value, options.form);
  if (!text)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("{}: the {} form cannot hold everything in it, such as control characters or "
                    "dates far off; nothing was written; take --to json",
                    options.file, options.form));
  Output output(options.output);
  output.write(*text);
  output.finish();
  if (options.form == "xml" && propertylist::readXMLPropertyList(bytesOf(*text)).value != value)
    printMessage(fmt::format(
        "note: {}: parts of a second were left out of its dates, which the xml form cannot hold; "
        "binary and json keep them",
        options.file));
  return ExitCode::done;
}

}  // namespace

void addConvertCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand(
      "convert", "Write a property list in another form, whichever form it is in");
  command->add_option("FILE", options->file, "The binary, XML or JSON form")->required();
  command->add_option("--to", options->form, "xml, binary or json")
      ->required()
      ->type_name("FORM")
      ->check(CLI::IsMember({"xml", "binary", "json"}));
  command->add_option("--output", options->output, "A file instead of standard output")
      ->type_name("FILE");
  command->footer(
      "The JSON form keeps everything: a date is {\"@date\": \"2026-11-21T02:40:00.25Z\"}, data "
      "is\n"
      "{\"@data\": BASE64}, a real has \".\" or an exponent, an integer has not. A dictionary "
      "whose\n"
      "only key begins with \"@\" has one more \"@\" there.\n\n"
      "Examples:\n"
      "  account-settings convert com.vantor.accountsettings.plist --to json\n"
      "  account-settings convert accounts.json --to binary --output accounts.plist");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
