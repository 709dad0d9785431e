// TuvoCgiLogin: an account login through PAM.
#include <syslog.h>
#include <tuvoplatform/cgi.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "pam_library.h"
#include "scoped_identity.h"

namespace {

constexpr int kAllowed = 1;
constexpr int kRefused = -1;
constexpr uid_t kRootUid = 0;
constexpr gid_t kRootGid = 0;

bool IsServiceCharacter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
         c == '_';
}

// PAM makes a file's name of it.
bool IsServiceName(std::string_view name) {
  return !name.empty() && std::all_of(name.begin(), name.end(), IsServiceCharacter);
}

// User names end up in log lines.
bool IsControl(char c) {
  return static_cast<unsigned char>(c) < ' ' || c == '\x7f';
}

// What PAM can take as an answer, and not empty: a directory service may take an empty password
// for an anonymous login, and let anybody in.
bool IsAnswer(const char* text) {
  return text != nullptr && *text != '\0' && strnlen(text, PAM_MAX_RESP_SIZE) < PAM_MAX_RESP_SIZE;
}

bool IsComplete(const LoginInfo* login) {
  if (login == nullptr || login->szClient == nullptr || !IsServiceName(login->szClient) ||
      !IsAnswer(login->szUser) || !IsAnswer(login->szPassword)) {
    return false;
  }
  const std::string_view user = login->szUser;
  return std::none_of(user.begin(), user.end(), IsControl);
}

// Stores the answer to one message; false when it is a prompt that this login has no answer for.
// Mere messages are passed over: there is nobody to show them to.
bool Answer(const pam_message& message, const LoginInfo& login, pam_response* response) {
  switch (message.msg_style) {
    case PAM_PROMPT_ECHO_OFF:
      response->resp = strdup(login.szPassword);
      return response->resp != nullptr;
    case PAM_PROMPT_ECHO_ON:
      response->resp = strdup(login.szUser);
      return response->resp != nullptr;
    case PAM_TEXT_INFO:
    case PAM_ERROR_MSG:
      return true;
    default:
      return false;
  }
}

void WipeAndFree(pam_response* responses, int count) {
  for (int i = 0; i < count; ++i) {
    if (responses[i].resp != nullptr) {
      explicit_bzero(responses[i].resp, std::strlen(responses[i].resp));
      std::free(responses[i].resp);
    }
  }
  std::free(responses);
}

// PAM's conversation. PAM wipes and frees what it is answered, hence the C allocations.
extern "C" int TuvoCgiConverse(int count, const struct pam_message** messages,
                               struct pam_response** responses, void* data) {
  if (count <= 0 || count > PAM_MAX_NUM_MSG || messages == nullptr || responses == nullptr ||
      data == nullptr) {
    return PAM_CONV_ERR;
  }
  auto* answers =
      static_cast<pam_response*>(std::calloc(static_cast<size_t>(count), sizeof(pam_response)));
  if (answers == nullptr) {
    return PAM_BUF_ERR;
  }
  const auto& login = *static_cast<const LoginInfo*>(data);
  for (int i = 0; i < count; ++i) {
    if (messages[i] == nullptr || !Answer(*messages[i], login, &answers[i])) {
      WipeAndFree(answers, count);
      return PAM_CONV_ERR;
    }
  }
  *responses = answers;
  return PAM_SUCCESS;
}

// One PAM transaction; both arguments must outlive it.
class PamLogin {
 public:
  PamLogin(const tuvo_platform::PamLibrary& pam, const LoginInfo& login)
      : pam_(pam), login_(login) {
    conversation_.conv = TuvoCgiConverse;
    // PAM hands the pointer back to the conversation above, which only reads through it.
    conversation_.appdata_ptr = const_cast<LoginInfo*>(&login_);
  }
  ~PamLogin() {
    if (handle_ != nullptr) {
      pam_.end(handle_, status_);
    }
  }
  PamLogin(const PamLogin&) = delete;
  PamLogin& operator=(const PamLogin&) = delete;

  // Authentication and account management both. `address` may be null.
  bool Check(const char* address) {
    const bool allowed =
        Passed(pam_.start(login_.szClient, login_.szUser, &conversation_, &handle_)) &&
        (address == nullptr || Passed(pam_.set_item(handle_, PAM_RHOST, address))) &&
        Passed(pam_.authenticate(handle_, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK)) &&
        Passed(pam_.acct_mgmt(handle_, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK));
    LogTrouble();
    return allowed;
  }

  // The account's name as PAM has it now (modules may change it); null when it has none.
  const char* User() {
    const void* user = nullptr;
    return pam_.get_item(handle_, PAM_USER, &user) == PAM_SUCCESS ? static_cast<const char*>(user)
                                                                  : nullptr;
  }

 private:
  bool Passed(int status) {
    status_ = status;
    return status == PAM_SUCCESS;
  }

  // Plain refusals are logged by the modules themselves; anything else is a login that could not be
  // checked, which somebody has to look into.
  void LogTrouble() const {
    switch (status_) {
      case PAM_SUCCESS:
      case PAM_AUTH_ERR:
      case PAM_USER_UNKNOWN:
      case PAM_MAXTRIES:
      case PAM_PERM_DENIED:
      case PAM_ACCT_EXPIRED:
      case PAM_AUTHTOK_EXPIRED:
      case PAM_NEW_AUTHTOK_REQD:
        break;
      default:
        syslog(LOG_ERR, "cgi_login:%d PAM service %s: %s", __LINE__, login_.szClient,
               pam_.strerror(handle_, status_));
        break;
    }
  }

  const tuvo_platform::PamLibrary& pam_;
  const LoginInfo& login_;
  pam_conv conversation_{};
  pam_handle_t* handle_ = nullptr;
  int status_ = PAM_SUCCESS;
};

void CopyTruncated(const char* text, char* out, unsigned int size) {
  if (out == nullptr || size == 0) {
    return;
  }
  const size_t length = strnlen(text, size - 1);
  std::memcpy(out, text, length);
  out[length] = '\0';
}

}  // namespace

int TuvoCgiLogin(TUVOCGI* cgi, char* reply, unsigned int size, const LoginInfo* login) {
  if (cgi == nullptr || cgi->request == nullptr || !IsComplete(login)) {
    return kRefused;
  }
  std::array<char, 65> address{};
  const bool has_address = TuvoCgiGetRemoteIP(address.data(), address.size()) == 0;
  // Without root the login is tried all the same: not every PAM module needs it.
  const tuvo_platform::ScopedIdentity root(kRootUid, kRootGid);
  const auto* library = tuvo_platform::PamLibrary::Get(login->szClient);
  if (library == nullptr) {
    return kRefused;
  }
  PamLogin pam(*library, *login);
  if (!pam.Check(has_address ? address.data() : nullptr)) {
    return kRefused;
  }
  const char* user = pam.User();
  if (user == nullptr) {
    return kRefused;
  }
  CopyTruncated(user, reply, size);
  return kAllowed;
}
