#include <tuvosharing/object.h>

namespace TUVO::sharing::record {

Object::Object() = default;
Object::Object(const Object&) = default;
Object::Object(Object&&) noexcept = default;
Object& Object::operator=(const Object&) = default;
Object& Object::operator=(Object&&) noexcept = default;
Object::~Object() = default;

}  // namespace TUVO::sharing::record
