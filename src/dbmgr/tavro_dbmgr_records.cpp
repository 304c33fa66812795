#include "tavro_dbmgr_internal.h"

void tavro_db_free_attachment(tavro_dbmgr_attachment_info *attachment) {
  if (!attachment) return;
  TAVRO_FREE(attachment->file_path);
  TAVRO_FREE(attachment->file_type);
  TAVRO_FREE(attachment);
}

void _tavro_free_attachement_list(GSList *attachments) {
  g_slist_free_full(attachments, [](gpointer attachment) {
    tavro_db_free_attachment(static_cast<tavro_dbmgr_attachment_info *>(attachment));
  });
}

GSList *_tavro_copy_attachment_list(const GSList *attachments) {
  GSList *copies = nullptr;
  for (; attachments; attachments = attachments->next) {
    const auto *attachment = static_cast<const tavro_dbmgr_attachment_info *>(attachments->data);
    if (!attachment) continue;
    auto *copy = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    *copy = *attachment;
    copy->file_path = TAVRO_STRDUP(attachment->file_path);
    copy->file_type = TAVRO_STRDUP(attachment->file_type);
    copies = g_slist_prepend(copies, copy);
  }
  return g_slist_reverse(copies);
}

void tavro_dbmgr_free_voc_data(svc_voc_data *voc) {
  if (!voc) return;
  for (char **text : {&voc->description, &voc->title_description, &voc->app_name, &voc->severity,
                      &voc->dump_file, &voc->date_of_creation, &voc->date_of_updation, &voc->dump_name,
                      &voc->syslog_file, &voc->device_data_filepath, &voc->submitted, &voc->app_icon,
                      &voc->user_name, &voc->type, &voc->push_comments})
    TAVRO_FREE(*text);
  _tavro_free_attachement_list(voc->attachments);
  TAVRO_FREE(voc);
}

void tavro_dbmgr_free_bug_report_data(tavro_dbmgr_bug_report_info *report) {
  if (!report) return;
  for (char **text :
       {&report->type, &report->description, &report->title_description, &report->app_name, &report->severity,
        &report->dump_file, &report->date_of_creation, &report->date_of_updation, &report->dump_name,
        &report->syslog_file, &report->syslog_name, &report->device_data_filepath, &report->app_icon,
        &report->user_name, &report->push_comments, &report->follow_up_verdict})
    TAVRO_FREE(*text);
  _tavro_free_attachement_list(report->attachments);
  TAVRO_FREE(report);
}

void tavro_dbmgr_free_suggestion_data(tavro_dbmgr_suggestion_info *suggestion) {
  if (!suggestion) return;
  for (char **text : {&suggestion->type, &suggestion->suggestion, &suggestion->title_description,
                      &suggestion->app_name, &suggestion->severity, &suggestion->date_of_creation,
                      &suggestion->date_of_updation, &suggestion->app_icon, &suggestion->user_name,
                      &suggestion->syslog_file, &suggestion->syslog_name, &suggestion->push_comments})
    TAVRO_FREE(*text);
  _tavro_free_attachement_list(suggestion->attachments);
  TAVRO_FREE(suggestion);
}

void tavro_db_free_data(void *record) {
  TAVRO_FREE(record);
}

void tavro_db_free_app_info(tavro_pkg_info *app) {
  if (!app) return;
  for (char **text : {&app->pkg_id, &app->app_id, &app->pkg_name, &app->pkg_icon}) TAVRO_FREE(*text);
  TAVRO_FREE(app);
}
