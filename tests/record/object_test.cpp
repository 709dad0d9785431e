// The base of the records, through a record that only shows what the base holds.
#include <gtest/gtest.h>
#include <tuvosharing/object.h>
#include <tuvosharing/row.h>

#include <map>
#include <memory>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include "support/class_layout.h"

namespace tuvo_test {

auto MembersOf(const TUVO::sharing::record::Object&);
template struct Reveal<TUVO::sharing::record::Object, &TUVO::sharing::record::Object::blValid_,
                       &TUVO::sharing::record::Object::id_, &TUVO::sharing::record::Object::key_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::Row;
using TUVO::sharing::record::Object;
using tuvo_test::kTablesCanBeRead;
using tuvo_test::MembersOf;
using tuvo_test::Slot;

class Probe : public Object {
 public:
  explicit Probe(bool* destroyed = nullptr) : destroyed_(destroyed) {}
  Probe(const Probe&) = default;
  Probe(Probe&&) = default;
  Probe& operator=(const Probe&) = default;
  Probe& operator=(Probe&&) = default;
  ~Probe() override {
    if (destroyed_ != nullptr) {
      *destroyed_ = true;
    }
  }

  std::vector<std::string> GetFieldList() const override { return {"list"}; }
  std::map<std::string, std::string> GetFieldMap() const override { return {{"map", ""}}; }
  bool IsLegal() const override { return blValid_; }
  void ToJSON(Json::Value&) const override {}
  bool FromRow(const Row&) override { return false; }

  using Object::blValid_;
  using Object::id_;
  using Object::key_;

 private:
  bool* destroyed_;
};

static_assert(std::is_abstract<Object>::value);
static_assert(std::has_virtual_destructor<Object>::value);
// Only whole records are copied, never the base alone.
static_assert(!std::is_constructible<Object, const Object&>::value);
static_assert(!std::is_assignable<Object&, const Object&>::value);

static_assert(std::is_same<decltype(&Object::GetFieldList),
                           std::vector<std::string> (Object::*)() const>::value);
static_assert(std::is_same<decltype(&Object::GetFieldMap),
                           std::map<std::string, std::string> (Object::*)() const>::value);
static_assert(std::is_same<decltype(&Object::IsLegal), bool (Object::*)() const>::value);
static_assert(std::is_same<decltype(&Object::ToJSON), void (Object::*)(Json::Value&) const>::value);
static_assert(std::is_same<decltype(&Object::FromRow), bool (Object::*)(const Row&)>::value);
static_assert(std::is_same<tuvo_test::TypesOf<decltype(MembersOf(std::declval<const Object&>()))>,
                           std::tuple<bool, int, std::string>>::value);

Probe Filled() {
  Probe probe;
  probe.blValid_ = false;
  probe.id_ = 12;
  probe.key_ = "a key that is too long for the small-string buffer";
  return probe;
}

TEST(Object, StartsUsableNotStoredAndWithoutKey) {
  const Probe probe;
  EXPECT_TRUE(probe.blValid_);
  EXPECT_EQ(probe.get_id(), 0);
  EXPECT_EQ(probe.key_, "");
}

TEST(Object, KeepsTheIdThatItIsGiven) {
  Probe probe;
  probe.set_id(-2147483647 - 1);
  EXPECT_EQ(probe.get_id(), -2147483647 - 1);
  probe.set_id(2147483647);
  EXPECT_EQ(probe.get_id(), 2147483647);
}

TEST(Object, CopiesEveryField) {
  const Probe source = Filled();
  const Probe constructed(source);
  Probe assigned;
  assigned = source;
  for (const Probe* copy : {&constructed, static_cast<const Probe*>(&assigned), &source}) {
    EXPECT_FALSE(copy->blValid_);
    EXPECT_EQ(copy->id_, 12);
    EXPECT_EQ(copy->key_, Filled().key_);
  }
}

TEST(Object, MovingTakesTheKeyAndLeavesTheNumbers) {
  Probe source = Filled();
  const Probe constructed(std::move(source));
  Probe second = Filled();
  Probe assigned;
  assigned = std::move(second);
  for (const Probe* target : {&constructed, static_cast<const Probe*>(&assigned)}) {
    EXPECT_FALSE(target->blValid_);
    EXPECT_EQ(target->id_, 12);
    EXPECT_EQ(target->key_, Filled().key_);
  }
  for (const Probe* left : {&source, &second}) {
    EXPECT_FALSE(left->blValid_);
    EXPECT_EQ(left->id_, 12);
    EXPECT_EQ(left->key_, "");
  }
}

TEST(Object, IsDestroyedThroughTheBase) {
  bool destroyed = false;
  std::unique_ptr<Object> object = std::make_unique<Probe>(&destroyed);
  object.reset();
  EXPECT_TRUE(destroyed);
}

// Programs that were built against the library look for members and operations in these places.

TEST(Object, FieldsStandInTheirOrder) {
  const Probe probe;
  const Object& object = probe;
  EXPECT_TRUE(tuvo_test::StandInThisOrder(object, MembersOf(object)));
}

TEST(Object, OperationsHaveTheirPlacesInTheTable) {
  if (!kTablesCanBeRead) {
    GTEST_SKIP() << "on this processor tables are read in another way";
  }
  // The destructor takes the first two.
  EXPECT_EQ(Slot(&Object::GetFieldList), 2U);
  EXPECT_EQ(Slot(&Object::GetFieldMap), 3U);
  EXPECT_EQ(Slot(&Object::IsLegal), 4U);
  EXPECT_EQ(Slot(&Object::ToJSON), 5U);
  EXPECT_EQ(Slot(&Object::FromRow), 6U);
  EXPECT_EQ(tuvo_test::SlotCount<Object>(), 7U);
}

}  // namespace
