#include "tests/support/ScriptedManager.h"

#include "Metrik/MetrikMgr.h"

using SyncServiceReport::MetrikMgr;

Throws g_managerThrows = Throws::Nothing;

// The linker redirects the calls of MetrikMgr::Init and MetrikMgr::Update to the functions below (its option
// --wrap). The real ones catch nearly all exceptions, so a test could not see what their caller does with
// one.
#define INIT "_ZN17SyncServiceReport9MetrikMgr4InitEv"
#define UPDATE                                                                                               \
    "_ZN17SyncServiceReport9MetrikMgr6UpdateERKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEE"

bool RealInit(MetrikMgr* manager) asm("__real_" INIT);
bool RealUpdate(MetrikMgr* manager, const std::string& json) asm("__real_" UPDATE);
bool ScriptedInit(MetrikMgr* manager) asm("__wrap_" INIT);
bool ScriptedUpdate(MetrikMgr* manager, const std::string& json) asm("__wrap_" UPDATE);

bool ScriptedInit(MetrikMgr* manager) {
    ThrowIf(g_managerThrows);
    return RealInit(manager);
}

bool ScriptedUpdate(MetrikMgr* manager, const std::string& json) {
    ThrowIf(g_managerThrows);
    return RealUpdate(manager, json);
}
