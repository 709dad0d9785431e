#include "owner/argument.h"

#include <json/reader.h>
#include <json/writer.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <limits>
#include <memory>
#include <sstream>
#include <string_view>

#include "owner/text_check.h"

namespace owner {

namespace {

const Argument* Find(const std::vector<Argument>& known, const std::string& name) {
  const auto found = std::find_if(known.begin(), known.end(), [&name](const Argument& argument) {
    return name == argument.name;
  });
  return found == known.end() ? nullptr : &*found;
}

std::string Shown(const std::string& name) {
  constexpr size_t kLongest = 64;
  return name.size() <= kLongest && IsPlainText(name) ? name : std::string();
}

bool HoldsZero(const std::string& text) {
  return text.find('\0') != std::string::npos;
}

// Depth, and the texts that are stored along with the object.
bool IsGoodTree(const Json::Value& value, int levels_left) {
  if (value.isString()) {
    return IsUtf8(value.asString());
  }
  if (!value.isObject() && !value.isArray()) {
    return true;
  }
  if (levels_left == 0) {
    return false;
  }
  for (auto member = value.begin(); member != value.end(); ++member) {
    if ((value.isObject() && !IsUtf8(member.name())) || !IsGoodTree(*member, levels_left - 1)) {
      return false;
    }
  }
  return true;
}

bool IsListOfTexts(const Json::Value& value) {
  return value.isArray() && std::all_of(value.begin(), value.end(),
                                        [](const Json::Value& item) { return item.isString(); });
}

bool IsOfKind(const Json::Value& value, Kind kind) {
  switch (kind) {
    case Kind::kText:
      return value.isString();
    case Kind::kInteger:
      return value.type() == Json::intValue || value.type() == Json::uintValue;
    case Kind::kBoolean:
      return value.isBool();
    case Kind::kTextList:
      return IsListOfTexts(value);
    case Kind::kObject:
      return value.isObject();
  }
  return false;
}

MaybeProblem CheckText(const Json::Value& value, const Argument& argument) {
  const std::string text = value.asString();
  return IsUtf8(text) && !HoldsZero(text)
             ? std::nullopt
             : Fault(Error::kBadValue, "must be UTF-8 text without zero bytes", argument.name);
}

MaybeProblem CheckContent(const Json::Value& value, const Argument& argument) {
  switch (argument.kind) {
    case Kind::kText:
      return CheckText(value, argument);
    case Kind::kInteger:
      return value.isInt() ? std::nullopt
                           : Fault(Error::kBadValue, "is too large a number", argument.name);
    case Kind::kTextList:
      for (const Json::Value& item : value) {
        if (MaybeProblem problem = CheckText(item, argument)) {
          return problem;
        }
      }
      return std::nullopt;
    case Kind::kObject:
      return IsGoodTree(value, kDeepestObject)
                 ? std::nullopt
                 : Fault(Error::kBadValue, "must be UTF-8 and not nested too deeply",
                         argument.name);
    case Kind::kBoolean:
      return std::nullopt;
  }
  return std::nullopt;
}

MaybeProblem CheckValue(const Json::Value& value, const Argument& argument) {
  if (!IsOfKind(value, argument.kind)) {
    return Fault(Error::kWrongType, std::string("must be of the type: ") + KindText(argument.kind),
                 argument.name);
  }
  return CheckContent(value, argument);
}

// A number that no int takes stays one that CheckArguments calls too large.
bool IntegerFrom(const std::string& text, Json::Value* value) {
  std::int64_t number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (stop != end || text.empty() || error == std::errc::invalid_argument) {
    return false;
  }
  *value = error == std::errc() ? Json::Value(static_cast<Json::Int64>(number))
                                : Json::Value(std::numeric_limits<Json::Int64>::max());
  return true;
}

bool BooleanFrom(const std::string& text, Json::Value* value) {
  const bool yes = text == "true" || text == "1";
  *value = yes;
  return yes || text == "false" || text == "0";
}

bool ValueFrom(const std::string& text, Kind kind, Json::Value* value) {
  switch (kind) {
    case Kind::kText:
      return true;
    case Kind::kInteger:
      return IntegerFrom(text, value);
    case Kind::kBoolean:
      return BooleanFrom(text, value);
    case Kind::kTextList:
    case Kind::kObject:
      return ReadJson(text, value);
  }
  return false;
}

}  // namespace

const char* KindText(Kind kind) {
  switch (kind) {
    case Kind::kText:
      return "text";
    case Kind::kInteger:
      return "integer";
    case Kind::kBoolean:
      return "boolean";
    case Kind::kTextList:
      return "list of texts";
    case Kind::kObject:
      return "object";
  }
  return "";
}

MaybeProblem CheckArguments(const Json::Value& arguments, const std::vector<Argument>& known) {
  for (const std::string& name : arguments.getMemberNames()) {
    if (Find(known, name) == nullptr) {
      return Fault(Error::kUnknownArgument, "is no argument of this method", Shown(name));
    }
  }
  for (const Argument& argument : known) {
    if (!arguments.isMember(argument.name)) {
      if (argument.needed) {
        return Fault(Error::kMissingArgument, "is needed", argument.name);
      }
      continue;
    }
    if (MaybeProblem problem = CheckValue(arguments[argument.name], argument)) {
      return problem;
    }
  }
  return std::nullopt;
}

MaybeProblem ConvertTexts(const std::vector<Argument>& known, Json::Value* arguments) {
  for (const std::string& name : arguments->getMemberNames()) {
    const Argument* argument = Find(known, name);
    Json::Value& value = (*arguments)[name];
    const std::string text = value.asString();
    if (argument != nullptr && !ValueFrom(text, argument->kind, &value)) {
      return Fault(Error::kWrongType,
                   std::string("must be of the type: ") + KindText(argument->kind), name);
    }
  }
  return std::nullopt;
}

bool ReadJson(const std::string& text, Json::Value* value) {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["strictRoot"] = false;
  builder["allowSpecialFloats"] = false;
  // Arguments stand in an object of their own, and the innermost values count as a level.
  builder["stackLimit"] = kDeepestObject + 2;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  try {
    return reader->parse(text.data(), text.data() + text.size(), value, nullptr);
  } catch (const Json::Exception&) {  // its way to say "too deep"
    return false;
  }
}

std::string WriteJson(const Json::Value& value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  const std::unique_ptr<Json::StreamWriter> writer(builder.newStreamWriter());
  std::ostringstream text;
  // Or memory that runs out in the middle would leave the rest away without a word.
  text.exceptions(std::ios_base::badbit);
  writer->write(value, &text);
  return text.str();
}

}  // namespace owner
