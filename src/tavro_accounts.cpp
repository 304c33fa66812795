#include "tavro_accounts.h"

#include <account.h>

#include <cstring>
#include <initializer_list>

#include "tavro_log.h"
#include "tavro_memory.h"

namespace {

constexpr char kMakersPackage[] = "corvaneaccount";

bool is_connected = false;

char *_read(account_h account, int (*getter)(account_h, char **)) {
  char *text = nullptr;
  if (getter(account, &text) != ACCOUNT_ERROR_NONE || !text) return nullptr;
  return TAVRO_ADOPT(text);
}

void _free_account(gpointer data) {
  auto *info = static_cast<tavro_account_info *>(data);
  for (char **text :
       {&info->user_name, &info->email, &info->display_name, &info->package, &info->domain, &info->icon}) {
    TAVRO_FREE(*text);
  }
  TAVRO_FREE(info);
}

bool _collect(account_h account, void *user_data) {
  auto *accounts = static_cast<GSList **>(user_data);
  tavro_account_info *info = TAVRO_ZALLOC(tavro_account_info);
  info->user_name = _read(account, account_get_user_name);
  info->email = _read(account, account_get_email_address);
  info->display_name = _read(account, account_get_display_name);
  info->package = _read(account, account_get_package_name);
  info->domain = _read(account, account_get_domain_name);
  info->icon = _read(account, account_get_icon_path);
  *accounts = g_slist_prepend(*accounts, info);
  return true;
}

}  // namespace

GSList *tavro_find_mail_id() {
  if (!is_connected) {
    const int ret = account_connect_readonly();
    if (ret != ACCOUNT_ERROR_NONE) {
      TAVRO_LOGE("account_connect_readonly failed: %d, %s", ret, get_error_message(ret));
      return nullptr;
    }
    is_connected = true;
  }
  GSList *accounts = nullptr;
  const int ret = account_foreach_account_from_db(_collect, &accounts);
  if (ret != ACCOUNT_ERROR_NONE && ret != ACCOUNT_ERROR_NO_DATA && ret != ACCOUNT_ERROR_RECORD_NOT_FOUND) {
    TAVRO_LOGE("account_foreach_account_from_db failed: %d, %s", ret, get_error_message(ret));
  }
  return g_slist_reverse(accounts);
}

void tavro_free_account_list(GSList *accounts) {
  g_slist_free_full(accounts, _free_account);
}

const tavro_account_info *tavro_check_corvane_account_in_list(const GSList *accounts) {
  for (const GSList *node = accounts; node; node = node->next) {
    const auto *info = static_cast<const tavro_account_info *>(node->data);
    if (info->package && std::strstr(info->package, kMakersPackage)) return info;
  }
  return nullptr;
}

void tavro_account_disconnect_db() {
  if (is_connected) account_disconnect_readonly();
  is_connected = false;
}
