// A PAM module for the login's tests: asks what its arguments say and lets in who answers right.
//   off=TEXT  a hidden prompt that wants TEXT     on=TEXT  a visible one
//   info, error  a message                        radio, binary  prompts of Linux-PAM's own kinds
//   none         a conversation of no message     name=TEXT  makes TEXT the user's name
//   ids=UID:GID  the effective ids that the process must have
//   flags=NUMBER  the flags that the module must be called with
// Asked for a session or for credentials, it leaves the file /tmp/pam-prompt-module behind.
#include <security/pam_appl.h>
#include <security/pam_modules.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <string>
#include <vector>

namespace {

struct Question {
  int style;
  std::string wanted;
};

int StyleOf(const std::string& word) {
  if (word == "off") {
    return PAM_PROMPT_ECHO_OFF;
  }
  if (word == "on") {
    return PAM_PROMPT_ECHO_ON;
  }
  if (word == "info") {
    return PAM_TEXT_INFO;
  }
  if (word == "error") {
    return PAM_ERROR_MSG;
  }
  return word == "radio" ? PAM_RADIO_TYPE : PAM_BINARY_PROMPT;
}

// All questions in one call, as some modules do.
int Ask(pam_handle_t* handle, const std::vector<Question>& questions) {
  const void* item = nullptr;
  if (pam_get_item(handle, PAM_CONV, &item) != PAM_SUCCESS || item == nullptr) {
    return PAM_SYSTEM_ERR;
  }
  std::vector<pam_message> messages;
  for (const Question& question : questions) {
    messages.push_back({question.style, "?"});
  }
  std::vector<const pam_message*> pointers;
  for (const pam_message& message : messages) {
    pointers.push_back(&message);
  }
  const auto* conversation = static_cast<const pam_conv*>(item);
  pam_response* responses = nullptr;
  const int status = conversation->conv(static_cast<int>(pointers.size()), pointers.data(),
                                        &responses, conversation->appdata_ptr);
  if (status != PAM_SUCCESS) {
    return status;
  }
  int result = PAM_SUCCESS;
  for (size_t i = 0; i < questions.size(); ++i) {
    const char* answer = responses[i].resp;
    if (questions[i].wanted != (answer == nullptr ? "" : answer)) {
      result = PAM_AUTH_ERR;
    }
    std::free(responses[i].resp);
  }
  std::free(responses);
  return result;
}

int LeaveTrace() {
  std::ofstream("/tmp/pam-prompt-module") << "asked";
  return PAM_SUCCESS;
}

}  // namespace

extern "C" __attribute__((visibility("default"))) int pam_sm_authenticate(pam_handle_t* handle,
                                                                          int flags, int argc,
                                                                          const char** argv) {
  std::vector<Question> questions;
  bool ask = false;
  for (int i = 0; i < argc; ++i) {
    const std::string argument = argv[i];
    const size_t equals = argument.find('=');
    const std::string word = argument.substr(0, equals);
    const std::string text = equals == std::string::npos ? "" : argument.substr(equals + 1);
    if (word == "name") {
      if (pam_set_item(handle, PAM_USER, text.c_str()) != PAM_SUCCESS) {
        return PAM_SYSTEM_ERR;
      }
    } else if (word == "ids") {
      if (std::to_string(geteuid()) + ":" + std::to_string(getegid()) != text) {
        return PAM_AUTH_ERR;
      }
    } else if (word == "flags") {
      if (std::to_string(flags) != text) {
        return PAM_AUTH_ERR;
      }
    } else {
      ask = true;
      if (word != "none") {
        questions.push_back({StyleOf(word), text});
      }
    }
  }
  return ask ? Ask(handle, questions) : PAM_SUCCESS;
}

extern "C" __attribute__((visibility("default"))) int pam_sm_setcred(pam_handle_t* /*handle*/,
                                                                     int /*flags*/, int /*argc*/,
                                                                     const char** /*argv*/) {
  return LeaveTrace();
}

extern "C" __attribute__((visibility("default"))) int pam_sm_open_session(pam_handle_t* /*handle*/,
                                                                          int /*flags*/,
                                                                          int /*argc*/,
                                                                          const char** /*argv*/) {
  return LeaveTrace();
}
