#include "account.h"

#include <dlog.h>
#include <pwd.h>
#include <unistd.h>

#include <new>
#include <string>
#include <vector>

#include "database.h"

struct account_s {
  int id = 0;
  std::string user_name, display_name, email_address, package_name, domain_name, icon_path;
};

namespace {

using namespace platform;
using Text = std::string account_s::*;

// Columns of the table behind the id, in this order; the file keeps them: append only.
constexpr Text kColumns[] = {&account_s::user_name,    &account_s::display_name, &account_s::email_address,
                             &account_s::package_name, &account_s::domain_name,  &account_s::icon_path};
// The first account's package: the account that the machine itself knows.
constexpr const char *kMachinePackage = "org.tavro.machine";

int open_connections = 0;

// The seed is bound to the phone's first use of its accounts: a person who removes the account keeps it
// removed.
Database &accounts() {
  static Database &database = *new Database(
      "account.db",
      "CREATE TABLE IF NOT EXISTS account(id INTEGER PRIMARY KEY AUTOINCREMENT, user_name TEXT NOT NULL,"
      " display_name TEXT NOT NULL, email_address TEXT NOT NULL, package_name TEXT NOT NULL,"
      " domain_name TEXT NOT NULL, icon_path TEXT NOT NULL, UNIQUE(package_name, user_name));");
  return database;
}

int insert(const account_s &account, const char *sql, int *id) {
  return accounts().run(
      sql,
      [&account](sqlite3_stmt *statement) {
        int index = 0;
        for (const Text column : kColumns) bind_text(statement, ++index, (account.*column).c_str());
      },
      [id](sqlite3_stmt *statement) {
        *id = sqlite3_column_int(statement, 0);
        return true;
      });
}

account_s machine_user() {
  account_s account;
  passwd entry, *found = nullptr;
  char buffer[16384];
  if (getpwuid_r(getuid(), &entry, buffer, sizeof(buffer), &found) != 0 || !found) {
    account.user_name = "user" + std::to_string(getuid());
  } else {
    account.user_name = found->pw_name;
    const ScopedGText valid(g_utf8_make_valid(found->pw_gecos ? found->pw_gecos : "", -1));
    const std::string full_name = valid.get();
    account.display_name = full_name.substr(0, full_name.find(','));
  }
  if (account.display_name.empty()) account.display_name = account.user_name;
  char host[256] = "localhost";
  gethostname(host, sizeof(host) - 1);
  account.email_address = account.user_name + "@" + host;
  account.package_name = kMachinePackage;
  account.domain_name = host;
  return account;
}

int open_store() {
  int ignored = 0;
  const int code = insert(machine_user(),
                          "INSERT INTO account(user_name, display_name, email_address, package_name,"
                          " domain_name, icon_path) SELECT ?1, ?2, ?3, ?4, ?5, ?6"
                          " WHERE NOT EXISTS (SELECT 1 FROM sqlite_sequence WHERE name = 'account')"
                          " RETURNING id",
                          &ignored);
  if (code != SQLITE_DONE) return ACCOUNT_ERROR_DB_FAILED;
  ++open_connections;
  return ACCOUNT_ERROR_NONE;
}

int close_store() {
  if (open_connections == 0) return ACCOUNT_ERROR_DB_NOT_OPENED;
  --open_connections;
  return ACCOUNT_ERROR_NONE;
}

int set_text(account_h account, Text field, const char *value) {
  if (!account || !value || !g_utf8_validate(value, -1, nullptr)) return ACCOUNT_ERROR_INVALID_PARAMETER;
  account->*field = value;
  return ACCOUNT_ERROR_NONE;
}

int get_text(account_h account, Text field, char **value) {
  if (!account || !value) return ACCOUNT_ERROR_INVALID_PARAMETER;
  const std::string &text = account->*field;
  *value = text.empty() ? nullptr : duplicate(text.c_str());
  return !text.empty() && !*value ? ACCOUNT_ERROR_OUT_OF_MEMORY : ACCOUNT_ERROR_NONE;
}

account_s read_account(sqlite3_stmt *statement) {
  account_s account;
  account.id = sqlite3_column_int(statement, 0);
  int index = 0;
  for (const Text column : kColumns) account.*column = column_text(statement, ++index);
  return account;
}

int walk(const char *sql, const char *parameter, account_cb callback, void *user_data) {
  if (!callback) return ACCOUNT_ERROR_INVALID_PARAMETER;
  if (open_connections == 0) return ACCOUNT_ERROR_DB_NOT_OPENED;
  std::vector<account_s> found;
  const int code = accounts().run(
      sql,
      [parameter](sqlite3_stmt *statement) {
        if (parameter) bind_text(statement, 1, parameter);
      },
      [&found](sqlite3_stmt *statement) {
        found.push_back(read_account(statement));
        return true;
      });
  if (code != SQLITE_DONE) return ACCOUNT_ERROR_DB_FAILED;
  if (found.empty()) return ACCOUNT_ERROR_RECORD_NOT_FOUND;
  for (account_s &account : found) {
    if (!callback(&account, user_data)) break;
  }
  return ACCOUNT_ERROR_NONE;
}

}  // namespace

int account_connect(void) {
  return open_store();
}
int account_disconnect(void) {
  return close_store();
}
int account_connect_readonly(void) {
  return open_store();
}
int account_disconnect_readonly(void) {
  return close_store();
}

int account_create(account_h *account) {
  if (!account) return ACCOUNT_ERROR_INVALID_PARAMETER;
  *account = new (std::nothrow) account_s;
  return *account ? ACCOUNT_ERROR_NONE : ACCOUNT_ERROR_OUT_OF_MEMORY;
}

int account_destroy(account_h account) {
  if (!account) return ACCOUNT_ERROR_INVALID_PARAMETER;
  delete account;
  return ACCOUNT_ERROR_NONE;
}

int account_get_account_id(account_h account, int *account_id) {
  if (!account || !account_id) return ACCOUNT_ERROR_INVALID_PARAMETER;
  *account_id = account->id;
  return ACCOUNT_ERROR_NONE;
}

int account_set_user_name(account_h account, const char *user_name) {
  return set_text(account, &account_s::user_name, user_name);
}

int account_get_user_name(account_h account, char **user_name) {
  return get_text(account, &account_s::user_name, user_name);
}

int account_set_display_name(account_h account, const char *display_name) {
  return set_text(account, &account_s::display_name, display_name);
}

int account_get_display_name(account_h account, char **display_name) {
  return get_text(account, &account_s::display_name, display_name);
}

int account_set_email_address(account_h account, const char *email_address) {
  return set_text(account, &account_s::email_address, email_address);
}

int account_get_email_address(account_h account, char **email_address) {
  return get_text(account, &account_s::email_address, email_address);
}

int account_set_package_name(account_h account, const char *package_name) {
  return set_text(account, &account_s::package_name, package_name);
}

int account_get_package_name(account_h account, char **package_name) {
  return get_text(account, &account_s::package_name, package_name);
}

int account_set_domain_name(account_h account, const char *domain_name) {
  return set_text(account, &account_s::domain_name, domain_name);
}

int account_get_domain_name(account_h account, char **domain_name) {
  return get_text(account, &account_s::domain_name, domain_name);
}

int account_set_icon_path(account_h account, const char *icon_path) {
  return set_text(account, &account_s::icon_path, icon_path);
}

int account_get_icon_path(account_h account, char **icon_path) {
  return get_text(account, &account_s::icon_path, icon_path);
}

int account_insert_to_db(account_h account, int *account_id) {
  if (!account || !account_id || account->user_name.empty() || account->package_name.empty()) {
    return ACCOUNT_ERROR_INVALID_PARAMETER;
  }
  if (open_connections == 0) return ACCOUNT_ERROR_DB_NOT_OPENED;
  const int code = insert(*account,
                          "INSERT INTO account(user_name, display_name, email_address, package_name,"
                          " domain_name, icon_path) VALUES(?1, ?2, ?3, ?4, ?5, ?6) RETURNING id",
                          &account->id);
  if (code == SQLITE_CONSTRAINT) return ACCOUNT_ERROR_DUPLICATED;
  if (code != SQLITE_DONE) return ACCOUNT_ERROR_DB_FAILED;
  *account_id = account->id;
  return ACCOUNT_ERROR_NONE;
}

int account_delete_from_db_by_id(int account_id) {
  if (open_connections == 0) return ACCOUNT_ERROR_DB_NOT_OPENED;
  bool was_there = false;
  const int code = accounts().run(
      "DELETE FROM account WHERE id = ?1 RETURNING 1",
      [account_id](sqlite3_stmt *statement) { sqlite3_bind_int(statement, 1, account_id); },
      [&was_there](sqlite3_stmt *) { return was_there = true; });
  if (code != SQLITE_DONE) return ACCOUNT_ERROR_DB_FAILED;
  return was_there ? ACCOUNT_ERROR_NONE : ACCOUNT_ERROR_RECORD_NOT_FOUND;
}

int account_foreach_account_from_db(account_cb callback, void *user_data) {
  return walk(
      "SELECT id, user_name, display_name, email_address, package_name, domain_name, icon_path"
      " FROM account ORDER BY id",
      nullptr, callback, user_data);
}

int account_query_account_by_package_name(account_cb callback, const char *package_name, void *user_data) {
  if (!package_name) return ACCOUNT_ERROR_INVALID_PARAMETER;
  return walk(
      "SELECT id, user_name, display_name, email_address, package_name, domain_name, icon_path"
      " FROM account WHERE package_name = ?1 ORDER BY id",
      package_name, callback, user_data);
}
