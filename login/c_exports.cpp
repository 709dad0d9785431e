// The login API for C programs.
#include <tuvosharing/login.h>

#include <algorithm>
#include <cstring>
#include <stdexcept>

// Programs were compiled against these five pointers and no more.
static_assert(sizeof(_tag_sharing_login_params) == 5 * sizeof(const char*));

namespace {

// A null pointer is the caller's error and ends a C program; the text is the one that such programs
// have always died with, whatever the standard library's version says.
std::string ToText(const char* text) {
  if (text == nullptr) {
    throw std::logic_error("basic_string::_M_construct null not valid");
  }
  return text;
}

}  // namespace

extern "C" {

int TuvoSharingLogin(char* out, unsigned int out_size, struct _tag_sharing_login_params* params,
                     int flag) {
  std::string session_id;
  const int result = TUVO::TuvoSharingLogin(session_id, params, flag == 1);
  if (out == nullptr || out_size == 0) {
    return result;
  }
  const size_t length = std::min<size_t>(session_id.size(), out_size);
  std::memcpy(out, session_id.data(), length);
  if (length < out_size) {
    out[length] = '\0';
  }
  out[out_size - 1] = '\0';
  return result;
}

int TuvoSharingIsAuthorized(const struct _tag_sharing_login_params* params) {
  return TUVO::TuvoSharingIsAuthorized(params);
}

int TuvoSharingLogout(const char* hash, const char* session_id) {
  return TUVO::TuvoSharingLogout(ToText(hash), ToText(session_id)) ? 1 : 0;
}

int TuvoSharingIncreaseUseCount(const char* hash) {
  return TUVO::TuvoSharingIncreaseUseCount(ToText(hash)) ? 1 : 0;
}

}  // extern "C"
