// JSON documents as they are stored in a column.
#ifndef INTERNAL_JSON_TEXT_H_
#define INTERNAL_JSON_TEXT_H_

#include <json/value.h>

#include <string>
#include <string_view>

namespace TUVO::sharing {

// So many values may be open in one another, the innermost one counted: 100 arrays, or 99 around
// a number. Well below what overflows a stack of 256 KiB.
constexpr int kDeepestJson = 100;

// One line without blanks between tokens and without a line end. Texts keep their bytes, whether or
// not they are UTF-8.
std::string JsonToText(const Json::Value& value);

// False, `value` unspecified, when the text is no JSON document or is nested too deeply. Never
// throws for any text.
bool TextToJson(std::string_view text, Json::Value& value);

// jsoncpp throws the same exception for a document that is nested too deeply and for want of
// memory, and only its text tells them apart. Throws std::bad_alloc in the second case: a document
// for which there is no memory must not be taken for none.
void RaiseIfOutOfMemory(const Json::Exception& error);

}  // namespace TUVO::sharing

#endif  // INTERNAL_JSON_TEXT_H_
