#pragma once

#include <string>

#include "Common/Paths.h"
#include "Common/Wire.h"

// Each source file has its own copy of these constants, built by its own static initialiser. So they can be
// used during static initialisation, when another file's shared copy might not exist yet.

static const std::string ORVEK_EMPTY_STRING = "";
static const std::string ORVEK_SPACE_STRING = " ";

/// For SystemTool::Clock::DateTime::ToString; %i stands for the milliseconds.
static const std::string DATE_TIME_FORMAT_MS = "%Y-%m-%d %H:%M:%S:%i";

/// The suite's registry key on the other platform; unused on this one.
static const std::string WIN_REG_PATH = "HKEY_LOCAL_MACHINE\\SOFTWARE\\HubLink";

/// The suite's preferences directory, and its machine-wide settings file there.
static const std::string MAC_REG_PATH = SyncServiceReport::Paths::SHARED;
static const std::string MAC_REG_INI = MAC_REG_PATH + "/local_machine.ini";
