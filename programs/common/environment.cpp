#include "common/environment.h"

#include <unistd.h>

#include <algorithm>
#include <utility>

namespace common {

namespace {

constexpr std::string_view kPost = "REQUEST_METHOD=POST";
constexpr std::string_view kQueryString = "QUERY_STRING=";

bool IsQueryString(const std::string& variable) {
  return variable.compare(0, kQueryString.size(), kQueryString) == 0;
}

void DropQueryOfPost(std::vector<std::string>* texts) {
  if (std::find(texts->begin(), texts->end(), kPost) != texts->end()) {
    texts->erase(std::remove_if(texts->begin(), texts->end(), IsQueryString), texts->end());
  }
}

}  // namespace

RequestEnvironment::RequestEnvironment(std::vector<std::string_view> names)
    : names_(std::move(names)) {}

RequestEnvironment::~RequestEnvironment() {
  environ = nullptr;
}

void RequestEnvironment::Become(const char* const* variables) {
  environ = nullptr;
  std::vector<std::string> texts;
  for (; variables != nullptr && *variables != nullptr; ++variables) {
    if (IsKept(*variables)) {
      texts.emplace_back(*variables);
    }
  }
  DropQueryOfPost(&texts);
  texts_ = std::move(texts);
  pointers_.clear();
  for (std::string& text : texts_) {
    pointers_.push_back(text.data());
  }
  pointers_.push_back(nullptr);
  environ = pointers_.data();
}

bool RequestEnvironment::IsKept(std::string_view variable) const {
  const std::string_view name = variable.substr(0, variable.find('='));
  return name.size() < variable.size() &&
         std::find(names_.begin(), names_.end(), name) != names_.end();
}

}  // namespace common
