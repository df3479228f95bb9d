#pragma once

// Every source file of the service that logs includes this header. The order of the headers below is also the
// order in which the statics of a source file are built: the plain constants, the logger, the constants that
// ask the system.
#include "Common/Constants.h"
#include "Common/Logger.h"

#include "Common/ServiceConstants.h"

#include "Common/IWorker.h"
#include "Common/Records.h"
