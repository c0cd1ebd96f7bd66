' A VBScript client meets a VISA session of the simulated visa32.dll (late-bound through IDispatch):
' two "modules" ask for the same VISA resource and share one session object and one VISA handle,
' Close closes it for both, and a resource whose viOpen fails reports the VISA library's description.
'
' Run with SM_SIM_SETUP naming sim/simsetup.ini (./scripts/demo.sh does it for you). cscript ends
' silently on a script error, so the last line, "visa-demo.vbs finished", tells that it ran to the end.
Option Explicit

Dim manager, moduleA, moduleB, handle, other
Set manager = CreateObject("SessionMgr.InstrSessionMgr")

WScript.Echo "== One VISA session, one handle =="
Set moduleA = manager.GetInstrSession("VISA::GPIB0::14::INSTR", False)
Set moduleB = manager.GetInstrSession("visa::gpib0::14::instr", False)
If moduleA Is moduleB Then
    WScript.Echo "module A and module B hold the same session object (category """ & moduleB.Category & """)"
Else
    WScript.Echo "module A and module B hold DIFFERENT objects"
End If
handle = moduleA.GetHandleEx(0)
WScript.Echo "module A: GetHandleEx(DefaultInterface) = " & handle & " (VarType " & VarType(handle) & ")"
WScript.Echo "module B: GetHandle(IODriver)          = " & moduleB.GetHandle(3)
WScript.Echo "session state: " & moduleB.StateDescription
moduleA.Close
WScript.Echo "after module A's Close, module B sees IsInitialized = " & moduleB.IsInitialized

WScript.Echo ""
WScript.Echo "== A resource whose viOpen fails =="
Set other = manager.GetInstrSession("VISA::ASRL9::INSTR", False)
On Error Resume Next
other.Initialize ""
WScript.Echo "Initialize: error " & Err.Number & " """ & Err.Description & """"
On Error GoTo 0

Set other = Nothing
Set moduleB = Nothing
Set moduleA = Nothing
Set manager = Nothing
WScript.Echo "visa-demo.vbs finished"
