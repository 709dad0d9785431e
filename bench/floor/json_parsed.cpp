#include <json/reader.h>
#include <json/value.h>

#include <memory>

#include "floor/json.h"

namespace {

// As utils/json_text.cpp has it, which keeps one, too.
Json::CharReader* NewReader() {
  Json::CharReaderBuilder builder;
  builder["collectComments"] = true;
  builder["allowTrailingCommas"] = false;
  builder["skipBom"] = false;
  builder["allowSpecialFloats"] = true;
  builder["stackLimit"] = 100;
  return builder.newCharReader();
}

}  // namespace

int parse_json(const char* text, size_t length) {
  static const std::unique_ptr<Json::CharReader> reader(NewReader());
  Json::Value value;
  return reader->parse(text, text + length, &value, nullptr) ? 0 : -1;
}
