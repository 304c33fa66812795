/* The mobile network of one modem, as the modem service last saw it. Value and error as in
 * telephony_common.h; a value that the network does not tell is OPERATION_FAILED and left alone. */
#pragma once

#include <telephony_common.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  TELEPHONY_NETWORK_SERVICE_STATE_IN_SERVICE = 0,
  TELEPHONY_NETWORK_SERVICE_STATE_OUT_OF_SERVICE,
  TELEPHONY_NETWORK_SERVICE_STATE_EMERGENCY_ONLY,
  TELEPHONY_NETWORK_SERVICE_STATE_RADIO_OFF,
} telephony_network_service_state_e;

/* Strength of the signal in steps, 0 for none to 6. */
typedef enum {
  TELEPHONY_NETWORK_RSSI_0 = 0,
  TELEPHONY_NETWORK_RSSI_1,
  TELEPHONY_NETWORK_RSSI_2,
  TELEPHONY_NETWORK_RSSI_3,
  TELEPHONY_NETWORK_RSSI_4,
  TELEPHONY_NETWORK_RSSI_5,
  TELEPHONY_NETWORK_RSSI_6,
} telephony_network_rssi_e;

int telephony_network_get_rssi(telephony_h handle, telephony_network_rssi_e *rssi);
/* The caller frees the name. */
int telephony_network_get_network_name(telephony_h handle, char **network_name);
int telephony_network_get_cell_id(telephony_h handle, int *cell_id);
int telephony_network_get_lac(telephony_h handle, int *lac);
int telephony_network_get_roaming_status(telephony_h handle, bool *status);
int telephony_network_get_service_state(telephony_h handle,
                                        telephony_network_service_state_e *network_service_state);

#ifdef __cplusplus
}
#endif
