#include <internal/json_text.h>
#include <json/reader.h>
#include <json/writer.h>

#include <atomic>
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

// Making a reader or writer takes as long as a short document does, so one of each is kept. Both
// begin every document anew, also after one that they threw at. Whoever comes while another thread
// has it makes one more.
template <typename Tool>
class Lent {
 public:
  Lent(std::atomic<Tool*>& spare, Tool* (*make)()) : spare_(spare), tool_(spare.exchange(nullptr)) {
    if (!tool_) {
      tool_.reset(make());
    }
  }
  ~Lent() { tool_.reset(spare_.exchange(tool_.release())); }
  Lent(const Lent&) = delete;
  Lent& operator=(const Lent&) = delete;

  Tool* operator->() const { return tool_.get(); }

 private:
  std::atomic<Tool*>& spare_;
  std::unique_ptr<Tool> tool_;
};

std::atomic<Json::CharReader*> spare_reader{nullptr};
std::atomic<Json::StreamWriter*> spare_writer{nullptr};

}  // namespace

std::string JsonToText(const Json::Value& value) {
  const Lent<Json::StreamWriter> writer(
      spare_writer, +[] { return CompactWriter().newStreamWriter(); });
  std::ostringstream text;
  // Or memory that runs out in the middle would leave the rest away without a word.
  text.exceptions(std::ios_base::badbit);
  writer->write(value, &text);
  return text.str();
}

bool TextToJson(std::string_view text, Json::Value& value) {
  const Lent<Json::CharReader> reader(
      spare_reader, +[] { return Reader().newCharReader(); });
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
