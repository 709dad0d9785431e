// Where a class has its data members and its virtual operations: programs that were built against
// the library rely on both.
#ifndef TESTS_SUPPORT_CLASS_LAYOUT_H_
#define TESTS_SUPPORT_CLASS_LAYOUT_H_

#include <cstddef>
#include <cstring>
#include <tuple>
#include <type_traits>
#include <vector>

namespace tuvo_test {

// Lets a test name the data members of a class that are not public, which the language allows in
// the arguments of an explicit instantiation alone. In namespace tuvo_test:
//
//   auto MembersOf(const Thing&);
//   template struct Reveal<Thing, &Thing::first_, &Thing::second_>;
//
// MembersOf(thing) is then a tuple of these pointers: `thing.*std::get<1>(MembersOf(thing))`.
template <typename Class, auto... Members>
struct Reveal {
  friend auto MembersOf(const Class& /*object*/) { return std::make_tuple(Members...); }
};

// std::tuple<bool, int> for a std::tuple<bool Thing::*, int Thing::*>.
template <typename Members>
struct TypesOfMembers;
template <typename... Classes, typename... Types>
struct TypesOfMembers<std::tuple<Types Classes::*...>> {
  using Type = std::tuple<Types...>;
};
template <typename Members>
using TypesOf = typename TypesOfMembers<Members>::Type;

// How many bytes behind the object's beginning each of these members stands.
template <typename Class, typename Members>
std::vector<std::ptrdiff_t> Offsets(const Class& object, const Members& members) {
  const auto offset = [&object](auto member) {
    return reinterpret_cast<const char*>(&(object.*member)) -
           reinterpret_cast<const char*>(&object);
  };
  return std::apply([&](auto... member) { return std::vector{offset(member)...}; }, members);
}

constexpr std::size_t RoundedUp(std::size_t size, std::size_t alignment) {
  return (size + alignment - 1) / alignment * alignment;
}

// Whether the members follow one another in memory with nothing but their alignment between them,
// the first right behind the pointer to the table of virtual operations, and nothing follows the
// last. An heir's own members follow those of its base.
template <typename Class, typename Members>
bool StandInThisOrder(const Class& object, const Members& members) {
  std::size_t end = sizeof(void*);
  const auto follows = [&](auto member) {
    using Type = std::remove_cv_t<std::remove_reference_t<decltype(object.*member)>>;
    const auto offset = static_cast<std::size_t>(Offsets(object, std::tuple(member)).front());
    const bool right_behind = offset == RoundedUp(end, alignof(Type));
    end = offset + sizeof(Type);
    return right_behind;
  };
  const bool in_order =
      std::apply([&](auto... member) { return (follows(member) && ...); }, members);
  return in_order && sizeof(Class) == RoundedUp(end, alignof(Class));
}

// Below is how x86 code finds virtual operations, 32 and 64 bits wide.
#if defined(__x86_64__) || defined(__i386__)
constexpr bool kTablesCanBeRead = true;
#else
constexpr bool kTablesCanBeRead = false;
#endif

constexpr std::size_t kNotVirtual = static_cast<std::size_t>(-1);

// The place of an operation in the table of its class, counted from 0; the destructor takes two. A
// pointer to a virtual operation holds that place in bytes, plus one.
template <typename Function>
std::size_t Slot(Function function) {
  std::ptrdiff_t parts[2];
  static_assert(sizeof function == sizeof parts);
  std::memcpy(parts, &function, sizeof parts);
  return (parts[0] & 1) != 0 ? static_cast<std::size_t>(parts[0] - 1) / sizeof(void*) : kNotVirtual;
}

// How many places the table of a class has: one more operation takes the next.
template <typename Class>
std::size_t SlotCount() {
  struct OneMore : Class {
    virtual void Next() {}
  };
  return Slot(&OneMore::Next);
}

// The code behind a place in the object's table.
template <typename Class>
const void* CodeAt(const Class& object, std::size_t slot) {
  const void* const* table = nullptr;
  std::memcpy(&table, &object, sizeof table);
  return table[slot];
}

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_CLASS_LAYOUT_H_
