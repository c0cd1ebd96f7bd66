' A VBScript client of the registered SessionMgr DLL showing the switch category: the routes and
' route groups that the simulated switch product offers (sim/simsetup.ini, installed beside the
' stand-ins by ./scripts/demo.sh) and a switch session that opens through the switch library.
'
' Run:  wine cscript //nologo <Windows path of this file>   (./scripts/demo.sh does it for you)
' The last line, "rq-demo.vbs finished", tells that the script ran to the end.
Option Explicit

Const ReturnVirtualInstruments = 2, IncludeCategoryPrefix = 8, ReturnRouteGroups = 16, ReturnRoutes = 32
Dim manager, names, session, handle
Set manager = CreateObject("SessionMgr.InstrSessionMgr")

WScript.Echo "== Switch names =="
names = manager.GetNames("RQ", ReturnVirtualInstruments + IncludeCategoryPrefix, "")
WScript.Echo "virtual devices:               " & Join(names, ", ")
names = manager.GetNames("RQ", ReturnRouteGroups + ReturnRoutes + IncludeCategoryPrefix, "SwitchDev1")
WScript.Echo "groups and routes of SwitchDev1: " & Join(names, ", ")

WScript.Echo ""
WScript.Echo "== A switch session =="
Set session = manager.GetInstrSession("RQ::DmmToDut", False)
handle = session.GetHandleEx(0)
WScript.Echo "GetInstrSession(""RQ::DmmToDut""): category " & session.Category & ", initialized " & _
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
