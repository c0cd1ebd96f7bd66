// The automation interfaces compiled from idl/SessionMgr.idl, safe to include anywhere.
#pragma once

#include <windows.h>
#include <ole2.h>

// wingdi.h maps GetObject to GetObjectA; IInstrSession has a method of that name.
#undef GetObject

#include "SessionMgr.h"
