/* All of the telephony interface. */
#pragma once

#include <telephony_common.h>
#include <telephony_network.h>
