#include "platform/login/module/PasswordPam.h"

#include <security/pam_appl.h>

#include <cstdlib>
#include <cstring>

#include "platform/base/TextBuffer.h"
#include "webapi/Export.h"

namespace {

constexpr char kService[] = "webapi";

void freeReplies(pam_response* replies, int count) {
  for (int i = 0; i < count; ++i) {
    if (replies[i].resp != nullptr) {
      explicit_bzero(replies[i].resp, strlen(replies[i].resp));
      free(replies[i].resp);
    }
  }
  free(replies);
}

/// Answers PAM's hidden prompt with the password; there is nobody to answer any other question.
int converse(int count, const pam_message** messages, pam_response** replies, void* password) {
  if (count <= 0 || count > PAM_MAX_NUM_MSG) {
    return PAM_CONV_ERR;
  }
  auto* answers =
      static_cast<pam_response*>(calloc(static_cast<size_t>(count), sizeof(pam_response)));
  if (answers == nullptr) {
    return PAM_BUF_ERR;
  }
  for (int i = 0; i < count; ++i) {
    const int style = messages[i]->msg_style;
    if (style == PAM_PROMPT_ECHO_OFF) {
      answers[i].resp = strdup(static_cast<const char*>(password));
    }
    const bool answered = style == PAM_PROMPT_ECHO_OFF && answers[i].resp != nullptr;
    if (!answered && style != PAM_TEXT_INFO && style != PAM_ERROR_MSG) {
      freeReplies(answers, count);
      return PAM_CONV_ERR;
    }
  }
  *replies = answers;
  return PAM_SUCCESS;
}

/// Errors that say "not this one", as opposed to "cannot say".
bool isRefusal(int error) {
  switch (error) {
    case PAM_AUTH_ERR:
    case PAM_USER_UNKNOWN:
    case PAM_MAXTRIES:
    case PAM_PERM_DENIED:
    case PAM_ACCT_EXPIRED:
    case PAM_NEW_AUTHTOK_REQD:
    case PAM_CRED_INSUFFICIENT:
    case PAM_CONV_ERR:  // the account wants more than a password
      return true;
    default:
      return false;
  }
}

int check(pam_handle_t* pam, const char* address, char* user, int size) {
  int error = *address != '\0' ? pam_set_item(pam, PAM_RHOST, address) : PAM_SUCCESS;
  if (error == PAM_SUCCESS) {
    error = pam_authenticate(pam, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK);
  }
  const bool isRight = error == PAM_SUCCESS;
  if (isRight) {
    error = pam_acct_mgmt(pam, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK);
  }
  const void* name = nullptr;
  if (error == PAM_SUCCESS) {
    error = pam_get_item(pam, PAM_USER, &name);
  }
  if (error == PAM_SUCCESS && name != nullptr &&
      !QELO::Platform::fillBuffer(static_cast<const char*>(name), user, size)) {
    error = PAM_BUF_ERR;
  }
  pam_end(pam, error);
  if (error == PAM_SUCCESS && name != nullptr) {
    return 1;
  }
  if (!isRefusal(error)) {
    return -1 - error;
  }
  return isRight ? 2 : 0;
}

}  // namespace

extern "C" WEBAPI_API int webapiPamCheck(const char* configuration, const char* account,
                                         const char* password, const char* address, char* user,
                                         int size) {
  const pam_conv conversation{converse, const_cast<char*>(password)};
  pam_handle_t* pam = nullptr;
  const int error = configuration != nullptr
                        ? pam_start_confdir(kService, account, &conversation, configuration, &pam)
                        : pam_start(kService, account, &conversation, &pam);
  return error == PAM_SUCCESS ? check(pam, address, user, size) : -1 - error;
}
