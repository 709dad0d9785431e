#include <internal/json_text.h>
#include <json/reader.h>
#include <json/writer.h>

#include <cstring>
#include <memory>
#include <new>
#include <sstream>

namespace TUVO::sharing {

namespace {

Json::StreamWriterBuilder CompactWriter() {
  Json::StreamWriterBuilder builder;
  builder["commentStyle"] = "None";
  builder["indentation"] = "";
  // Without this the writer decodes texts as UTF-8, and bytes that are none are lost.
  builder["emitUTF8"] = true;
  // Numbers without a JSON form come back as what they were; otherwise they would be written as
  // something that the reader refuses, and the whole document with it.
  builder["useSpecialFloats"] = true;
  return builder;
}

Json::CharReaderBuilder Reader() {
  Json::CharReaderBuilder builder;
  builder["collectComments"] = true;
  builder["allowTrailingCommas"] = false;
  builder["skipBom"] = false;
  builder["allowSpecialFloats"] = true;
  // The reader refuses when this many values are open already.
  builder["stackLimit"] = kDeepestJson;
  return builder;
}

}  // namespace

std::string JsonToText(const Json::Value& value) {
  static const Json::StreamWriterBuilder builder = CompactWriter();
  const std::unique_ptr<Json::StreamWriter> writer(builder.newStreamWriter());
  std::ostringstream text;
  // Or memory that runs out in the middle would leave the rest away without a word.
  text.exceptions(std::ios_base::badbit);
  writer->write(value, &text);
  return text.str();
}

bool TextToJson(const std::string& text, Json::Value& value) {
  static const Json::CharReaderBuilder builder = Reader();
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  try {
    return reader->parse(text.data(), text.data() + text.size(), &value, nullptr);
  } catch (const Json::Exception& error) {
    RaiseIfOutOfMemory(error);
    return false;  // nested too deeply
  }
}

void RaiseIfOutOfMemory(const Json::Exception& error) {
  if (std::strstr(error.what(), "Failed to allocate") != nullptr) {
    throw std::bad_alloc();
  }
}

}  // namespace TUVO::sharing
