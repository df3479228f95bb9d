#pragma once

// What every source file of the service but the UDP receiver includes. The order is also the order in which a
// source file's statics are built: the plain constants, the logger, the constants that ask the system.
#include "Common/Constants.h"
#include "Common/Logger.h"

#include "Common/ServiceConstants.h"

#include "Common/IWorker.h"
#include "Common/Records.h"
