' A VBScript client of the registered SessionMgr DLL showing the switch category: the routes and
' route groups that the simulated switch product offers (sim/simsetup.ini, which ./scripts/demo.sh
' names in SM_SIM_SETUP) and a switch session that opens through the switch library.
'
' Run:  wine cscript //nologo <Windows path of this file>   (./scripts/demo.sh does it for you)
' The last line, "rq-demo.vbs finished", tells that the script ran to the end. Wine's VBScript cannot
' index or join an array of strings (VarType 8200, what GetNames returns), so the names themselves are
' printed by the C++ client examples/RQDemo.cpp.
Option Explicit

Const ReturnVirtualInstruments = 2, IncludeCategoryPrefix = 8, ReturnRouteGroups = 16, ReturnRoutes = 32
Dim manager, names, session, handle
Set manager = CreateObject("SessionMgr.InstrSessionMgr")

WScript.Echo "== Switch names =="
names = manager.GetNames("RQ", ReturnRouteGroups + ReturnRoutes + IncludeCategoryPrefix, "SwitchDev1")
WScript.Echo "GetNames(""RQ"") for SwitchDev1 gives an array of VarType " & VarType(names) & " (string array = 8200)"

WScript.Echo ""
WScript.Echo "== A switch session =="
Set session = manager.GetInstrSession("RQ::DmmToDut", False)
handle = session.GetHandleEx(0)
WScript.Echo "RQ::DmmToDut: category " & session.Category & ", initialized " & _
             session.IsInitialized() & ", handle of VarType " & VarType(handle) & " (VT_UI8 = 21)"
session.Close
WScript.Echo "after Close: initialized " & session.IsInitialized()
On Error Resume Next
Set session = manager.GetInstrSession("RQ::BrokenRoute", False)
session.Initialize ""
WScript.Echo "RQ::BrokenRoute: error " & Err.Number & " """ & Err.Description & """"
Err.Clear
On Error GoTo 0

WScript.Echo "rq-demo.vbs finished"
