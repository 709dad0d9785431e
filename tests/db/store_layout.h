// How a table's store lies in memory, on which programs rely that were built against the library.
#ifndef TESTS_DB_STORE_LAYOUT_H_
#define TESTS_DB_STORE_LAYOUT_H_

#include <gtest/gtest.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/object_db.h>

#include <type_traits>

#include "support/class_layout.h"

namespace tuvo_test {

// A store that adds nothing to what all stores share.
class PlainStore : public TUVO::sharing::db::ObjectDB {
 public:
  explicit PlainStore(TUVO::sharing::db::BaseDB& db) : ObjectDB(db, "plain") {}
  int Flag() const { return GetFlag(); }
};

// The store behind the handle has the operations that all stores share, in their places, and but
// the deleting by id as they are for all; the handle has its destructor alone.
template <typename Handle, typename Store>
void ExpectTablesOfAStore(TUVO::sharing::db::BaseDB& db) {
  static_assert(std::is_base_of_v<TUVO::sharing::db::ObjectDB, Store>);
  static_assert(sizeof(Store) == sizeof(TUVO::sharing::db::ObjectDB), "adds no members");
  static_assert(sizeof(Handle) == 2 * sizeof(void*), "one pointer beside the table's");
  static_assert(std::has_virtual_destructor_v<Handle>);
  static_assert(!std::is_copy_constructible_v<Handle> && !std::is_copy_assignable_v<Handle>);
  if (!kTablesCanBeRead) {
    GTEST_SKIP() << "on this processor tables are read in another way";
  }
  EXPECT_EQ(SlotCount<Handle>(), 2U);
  EXPECT_EQ(SlotCount<Store>(), 8U);
  const Store store(db);
  const PlainStore plain(db);
  constexpr std::size_t kDeleteById = 4;
  for (std::size_t slot = 2; slot < 8; ++slot) {
    EXPECT_EQ(CodeAt(store, slot) == CodeAt(plain, slot), slot != kDeleteById) << slot;
  }
}

}  // namespace tuvo_test

#endif  // TESTS_DB_STORE_LAYOUT_H_
