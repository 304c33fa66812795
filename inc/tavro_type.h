// Status of a report. Stored as decimal text in VOC_STATE and sent by the desk: values are append-only.
#pragma once

// 0 to 6 are the server's own status codes, 10 to 12 are local transfer states; the gap is deliberate.
enum tavro_status_e {
  TAVRO_STATUS_SENDING_FAILED = 0,
  TAVRO_STATUS_UNDER_REVIEW = 1,
  TAVRO_STATUS_IN_PROCESS = 2,
  TAVRO_STATUS_SOLVED = 3,
  TAVRO_STATUS_COMPLETED = 4,
  TAVRO_STATUS_DECLINED = 5,
  TAVRO_STATUS_DRAFT_SAVED = 6,
  TAVRO_STATUS_SENDING = 10,
  TAVRO_STATUS_SENDING_FAILED_NO_NETWORK = 11,
  TAVRO_STATUS_SENDING_SUCCESS = 12,
};
