#include <cstdlib>
#include <cstring>

#include "platform/accounts/AccountDatabase.h"
#include "webapi/platform/Core.h"

using QELO::Platform::Account;
using QELO::Platform::Lookup;

extern "C" {

int QELOUserGetByUID(uid_t uid, QeloUser** user) {
  Account account;
  *user = nullptr;
  if (QELO::Platform::findAccountById(uid, account) != Lookup::kFound) {
    return -1;
  }
  char* name = strdup(account.name.c_str());
  if (name == nullptr) {
    return -1;
  }
  *user = new QeloUser{name, account.uid, account.gid};
  return 0;
}

void QELOUserFree(QeloUser* user) {
  if (user != nullptr) {
    free(user->name);
    delete user;
  }
}

}  // extern "C"
