' IVI through the registered SessionMgr DLL, late-bound: one session of the simulated IVI store (the
' IVI block of sim/simsetup.ini) opened by its logical name through the class driver, with its class,
' specific and I/O handles. Wine's VBScript cannot walk the typed arrays that GetNames and
' GetCategories return, so the listings are left to examples/IviDemo.cpp.
'
' Run:  SM_SIM_SETUP=<Windows path of sim/simsetup.ini> wine cscript //nologo <Windows path of this file>
' (./scripts/demo.sh does it for you). The last line, "ivi-demo.vbs finished", tells that it ran to
' the end.
Option Explicit

Dim manager, session
Set manager = CreateObject("SessionMgr.InstrSessionMgr")


WScript.Echo "== GetInstrSession(""IVI::MyDmm"") =="
Set session = manager.GetInstrSession("IVI::MyDmm", False)
WScript.Echo "name """ & session.Name & """, category """ & session.Category & """"
session.Initialize "Simulate=1"
WScript.Echo "class driver handle    (ClassDriver):    &H" & Hex(session.GetHandleEx(1))
WScript.Echo "specific driver handle (SpecificDriver): &H" & Hex(session.GetHandleEx(2))
WScript.Echo "I/O session            (IODriver):       &H" & Hex(session.GetHandleEx(3))
If manager.GetInstrSession("IviDmm::DMM1", False) Is session Then
    WScript.Echo """IviDmm::DMM1"" gives the same session"
End If
WScript.Echo session.StateDescription
session.Close
WScript.Echo "ivi-demo.vbs finished"
