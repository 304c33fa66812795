#include "tavro_not_yet.h"

#include "tavro_log.h"

#define TAVRO_NOT_YET(what) TAVRO_LOGD("not there yet: %s", what)

void ewk_shutdown() {
  TAVRO_NOT_YET("the web engine");
}

void tavro_load_url(appdata *, int) {
  TAVRO_NOT_YET("community pages");
}

void tavro_create_account_page_ui(appdata *, GSList *) {
  TAVRO_NOT_YET("the page of the maker's accounts");
}

int tavro_add_account_result(appdata *) {
  TAVRO_NOT_YET("adding the maker's account");
  return 0;
}

Evas_Object *tavro_beta_details_optin_button(appdata *) {
  TAVRO_NOT_YET("the beta details page");
  return nullptr;
}

void tavro_refresh_beta_pages(appdata *, const char *what) {
  TAVRO_NOT_YET(what);
}

void tavro_refresh_banners(appdata *) {
  TAVRO_NOT_YET("the banner carousel");
}
