// What stays small however a value is built: the stack when it is nested, the effort when it is
// shared.
#include <gtest/gtest.h>
#include <sys/mman.h>

#include <atomic>
#include <new>
#include <span>
#include <thread>

#include "propertylist/Reading.h"
#include "propertylist/Value.h"
#include "propertylist/Writing.h"
#include "tests/propertylist/SmallStack.h"

namespace propertylist {
namespace {

// `levels` containers in one another, arrays and dictionaries by turns, around a text.
Value nested(std::size_t levels) {
  Value value("innermost");
  for (std::size_t i = 0; i < levels; ++i) {
    value = i % 2 == 0 ? Value(Array{value}) : Value(Dictionary{{"key", value}});
  }
  return value;
}

// 2^levels texts, of which only one is stored.
Value doubled(std::size_t levels) {
  Value value("leaf");
  for (std::size_t i = 0; i < levels; ++i) {
    value = i % 2 == 0 ? Value(Array{value, value}) : Value(Dictionary{{"a", value}, {"b", value}});
  }
  return value;
}

TEST(NestedValues, AreMadeCopiedComparedDescribedAndDroppedOnASmallStack) {
  runOnSmallStack([] {
    const Value value = nested(50000);
    const Value twin = nested(50000);
    const Value copy = value;
    EXPECT_TRUE(value == twin);
    EXPECT_TRUE(value == copy);
    EXPECT_FALSE(value == nested(49998));
    EXPECT_EQ(describe(value).substr(0, 23), "{key = ({key = ({key = ");
  });
}

TEST(NestedValues, AreWrittenUpToTheLimitOfTheReaderOnly) {
  runOnSmallStack([] {
    const Value deepest = nested(512);
    EXPECT_EQ(readBinaryPropertyList(*writeBinaryPropertyList(deepest)).value, deepest);
    const std::string xml = *writeXMLPropertyList(deepest);
    EXPECT_EQ(readXMLPropertyList(Bytes(xml.begin(), xml.end())).value, deepest);
    for (const std::size_t levels : {513U, 50000U}) {
      EXPECT_EQ(writeBinaryPropertyList(nested(levels)), std::nullopt);
      EXPECT_EQ(writeXMLPropertyList(nested(levels)), std::nullopt);
    }
  });
}

// Pages of nothing, which take no memory as long as nobody writes to them.
class Pages {
 public:
  explicit Pages(std::size_t size)
      : _size(size),
        _at(::mmap(nullptr, size, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0)) {
    if (_at == MAP_FAILED) throw std::bad_alloc();
  }
  Pages(const Pages&) = delete;
  Pages& operator=(const Pages&) = delete;
  ~Pages() { ::munmap(_at, _size); }

  std::span<const std::uint8_t> bytes(std::size_t count) const {
    return {static_cast<const std::uint8_t*>(_at), count};
  }

 private:
  std::size_t _size;
  void* _at;
};

TEST(LargeLists, AreRefusedBeforeTheyAreLookedAt) {
  const Pages pages(kMaximumFileSize + 1);
  const auto most = pages.bytes(kMaximumFileSize);
  const auto tooMany = pages.bytes(kMaximumFileSize + 1);
  EXPECT_EQ(readBinaryPropertyList(tooMany).error.what, "too large");
  EXPECT_EQ(readBinaryPropertyList(tooMany).error.byteOffset, kMaximumFileSize);
  EXPECT_EQ(readXMLPropertyList(tooMany).error.what, "too large");
  EXPECT_NE(readBinaryPropertyList(most).error.what, "too large");
  EXPECT_NE(readXMLPropertyList(most).error.what, "too large");
}

TEST(SharedValues, AreComparedByWhatIsStored) {
  EXPECT_TRUE(doubled(60) == doubled(60));
  EXPECT_FALSE(doubled(60) == doubled(61));
  EXPECT_FALSE(doubled(60) == Value(Array{doubled(59), doubled(59), 1}));
}

TEST(SharedValues, AreComparedByWhatIsStoredAlsoWhenTheyShareAtOtherLevels) {
  // Each doubles at every second level, but they do not share the same levels.
  Value even("leaf");
  Value odd("leaf");
  for (int i = 0; i < 40; ++i) {
    even = Array{Array{even}, Array{even}};
    const Value both(Array{odd});
    odd = Array{both, both};
  }
  EXPECT_TRUE(even == odd);
  EXPECT_TRUE(odd == even);
}

TEST(SharedValues, AreComparedByWhatIsStoredAlsoWhenALongTextIsShared) {
  const auto many = [] {
    const Value text(std::make_shared<const std::string>(1 << 20, 'x'));
    return Value(Array(std::vector<Value>(100000, text)));
  };
  EXPECT_TRUE(many() == many());
}

TEST(SharedValues, OfMoreThanAFileCanHoldAreNotWritten) {
  EXPECT_EQ(writeBinaryPropertyList(doubled(60)), std::nullopt);
  EXPECT_EQ(writeBinaryPropertyList(doubled(200)), std::nullopt);
}

TEST(SharedValues, AreDescribedUpToTheLimit) {
  const std::string text = describe(doubled(60));
  EXPECT_EQ(text.size(), kMaximumDescription + 3);
  EXPECT_EQ(text.substr(text.size() - 3), "...");
}

TEST(SharedValues, MayBeChangedOnSeveralThreadsAtATime) {
  const Dictionary common{{"list", Array{1, 2, 3}}, {"name", "x"}};
  std::atomic<int> good = 0;
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([mine = common, t, &good] {
      for (int i = 0; i < 1000; ++i) {
        Dictionary copy = mine;
        Array list = *findArray(copy, "list");
        list.replace(0, t);
        copy.set("list", list);
        if (copy == Dictionary{{"list", Array{t, 2, 3}}, {"name", "x"}}) ++good;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(good, 4000);
  EXPECT_EQ(common, (Dictionary{{"list", Array{1, 2, 3}}, {"name", "x"}}));
}

}  // namespace
}  // namespace propertylist
