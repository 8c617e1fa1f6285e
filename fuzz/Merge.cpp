// The input describes three dictionaries of a few keys and values, many of them equal: the store
// merges them as the model does, and tells the versions apart whatever storage they share.
#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "fuzz/Check.h"
#include "fuzz/MergeModel.h"
#include "platform/testing/InMemoryDevice.h"

namespace {

using namespace propertylist;

// Makes dictionaries of the input's bytes; of what is missing the bytes are zero.
class Input {
 public:
  Input(const std::uint8_t* data, std::size_t size) : _next(data), _end(data + size) {}

  std::optional<Dictionary> dictionary() {
    const std::uint8_t head = _byte();
    if (head == 0xFF) return std::nullopt;
    Dictionary made;
    for (int entries = head % 12; entries > 0; --entries) {
      const std::string key = "key" + std::to_string(_byte() % 8);
      made.set(key, _value(3));
    }
    return made;
  }

 private:
  std::uint8_t _byte() { return _next == _end ? std::uint8_t{0} : *_next++; }

  // Values that look alike: numbers of three kinds, texts and data, empty and nested containers.
  Value _value(int levels) {
    const std::uint8_t byte = _byte();
    switch (byte % 10) {
      case 0:
        return byte / 10 % 3;
      case 1:
        return static_cast<double>(byte / 10 % 3);
      case 2:
        return byte / 10 % 2 == 0;
      case 3:
        return std::string(byte / 10 % 3U, 'a');
      case 4:
        return Bytes(byte / 10 % 3U, 'a');
      case 5:
        return Date{static_cast<double>(byte / 10 % 3)};
      case 6:
        return Array();
      case 7:
        return levels > 0 ? Value(Array{_value(levels - 1), _value(levels - 1)}) : Value(Array());
      case 8:
        return levels > 0 ? Value(Dictionary{{"a", _value(levels - 1)}}) : Value(Dictionary());
      default:
        return *_shared[byte / 10 % _shared.size()];
    }
  }

  const std::uint8_t* _next;
  const std::uint8_t* _end;
  const std::vector<std::shared_ptr<const Value>> _shared = {
      std::make_shared<const Value>("a"), std::make_shared<const Value>(Array{0, 1}),
      std::make_shared<const Value>(Dictionary{{"a", 1}})};
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const platform::InMemoryDevice device;
  static const auto store =
      accountsettings::ASSAccountsManager::initWithAccounsInfoArray(std::nullopt);
  Input input(data, size);
  const Dictionary inMemory = input.dictionary().value_or(Dictionary());
  const std::optional<Dictionary> original = input.dictionary();
  const std::optional<Dictionary> onDisk = input.dictionary();
  const Dictionary merged =
      store->mergeInMemoryPropertiesOriginalPropertiesOnDiskProperties(inMemory, original, onDisk);
  FUZZ_CHECK(merged == fuzz::mergeModel(inMemory, original.value_or(Dictionary()),
                                        onDisk.value_or(Dictionary())));
  return 0;
}
