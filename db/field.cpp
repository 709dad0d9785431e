#include <tuvosharing/field.h>

#include <locale>

namespace TUVO::sharing::db {

Field::Field(const std::string& value) : value_(value) {
  // Numbers are stored without any grouping, whatever the program's locale.
  stream_.imbue(std::locale::classic());
}

Field::Field(const Field& other) : Field(other.value_) {}

Field& Field::operator=(const Field& other) {
  if (this != &other) {
    value_ = other.value_;
    stream_ = std::stringstream();
    stream_.imbue(std::locale::classic());
  }
  return *this;
}

Field::~Field() = default;

void Field::Clear() {
  stream_.str(value_);
}

template <typename T>
T Field::Extract(T def) {
  Clear();
  T number{};
  stream_ >> number;
  return stream_.fail() ? def : number;
}

int Field::AsInt(int def) {
  return Extract(def);
}

unsigned int Field::AsUInt(unsigned int def) {
  return Extract(def);
}

long Field::AsTime(long def) {
  return Extract(def);
}

float Field::AsFloat(float def) {
  return Extract(def);
}

bool Field::AsBool(bool /*def*/) {
  Clear();
  return value_ == "1";
}

const std::string& Field::AsString(const std::string& /*def*/) const {
  return value_;
}

}  // namespace TUVO::sharing::db
