#include <internal/json_text.h>
#include <internal/log.h>
#include <internal/popen.h>
#include <json/reader.h>
#include <tuvosharing/send_webapi.h>
#include <tuvosharing/utils.h>

#include <cstdio>
#include <vector>

namespace TUVO::sharing {

namespace {

constexpr char kTool[] = "/usr/tuvo/bin/tuvowebapi";
constexpr size_t kChunkSize = 4096;

std::vector<std::string> Arguments(const std::string& api, int version, const std::string& method,
                                   const Json::Value& params) {
  std::vector<std::string> arguments = {"tuvowebapi", "--exec", "api=" + api,
                                        "version=" + ToString<int const>(version),
                                        "method=" + method};
  for (const std::string& name : params.getMemberNames()) {
    arguments.push_back(name + "=" + params[name].asString());
  }
  return arguments;
}

std::string ReadAll(FILE* file) {
  std::string text;
  char chunk[kChunkSize];
  for (size_t length = 0; (length = std::fread(chunk, 1, sizeof chunk, file)) != 0;) {
    text.append(chunk, length);
  }
  return text;
}

// The documents' own reader is stricter than what callers know of this function, which takes every
// document that the JSON library's plain reader takes.
bool Parse(const std::string& text, Json::Value& value) {
  try {
    return Json::Reader().parse(text, value, false);
  } catch (const Json::Exception& error) {
    RaiseIfOutOfMemory(error);
    return false;  // nested too deeply
  }
}

}  // namespace

bool SendWebapi(Json::Value& reply, const std::string& api, int version, const std::string& method,
                const Json::Value& params) {
  // They may be the reply, or a part of it.
  // NOLINTNEXTLINE(performance-unnecessary-copy-initialization)
  const Json::Value given = params;
  reply = Json::Value(Json::objectValue);
  const internal::Popen file(kTool, Arguments(api, version, method, given));
  if (file.file == nullptr) {
    SHARING_LOG_PID("popen failed\n\n");
    return false;
  }
  if (!Parse(ReadAll(file.file), reply)) {
    SHARING_LOG_PID("json read failed\n\n");
    return false;
  }
  return true;
}

}  // namespace TUVO::sharing
