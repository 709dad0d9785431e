// Named, typed values that a request brings.
#ifndef PROGRAMS_OWNER_ARGUMENT_H_
#define PROGRAMS_OWNER_ARGUMENT_H_

#include <json/value.h>

#include <string>
#include <vector>

#include "owner/problem.h"

namespace owner {

enum class Kind { kText, kInteger, kBoolean, kTextList, kObject };

struct Argument {
  const char* name;
  Kind kind;
  bool needed = false;
};

// Objects are taken up to this many levels deep, the object itself counted: far below what the
// records can load.
constexpr int kDeepestObject = 32;

// "text", "integer", "boolean", "list of texts", "object".
const char* KindText(Kind kind);

// Whether `arguments`, an object, holds nothing but `known` arguments, all that are needed, each of
// its kind. Integers fit into 32 signed bits; texts, members' names and texts within lists and
// objects are UTF-8, and those outside of objects hold no zero byte; objects are at most
// kDeepestObject levels deep. The first fault is returned, unknown names first.
MaybeProblem CheckArguments(const Json::Value& arguments, const std::vector<Argument>& known);

// Replaces the texts in `arguments`, an object of texts, by values of their arguments' kinds, as
// docs/webapi.md has it for query strings and command lines. What is unknown stays a text, for
// CheckArguments to refuse; a text that cannot be read as its kind is the problem returned.
MaybeProblem ConvertTexts(const std::vector<Argument>& known, Json::Value* arguments);

// Reads a JSON document strictly: one value, no comments, no duplicate names, at most
// kDeepestObject levels deep. False when `text` is not such a document; `value` is then
// unspecified.
bool ReadJson(const std::string& text, Json::Value* value);

// One compact line, characters outside ASCII as they are.
std::string WriteJson(const Json::Value& value);

}  // namespace owner

#endif  // PROGRAMS_OWNER_ARGUMENT_H_
