' A VBScript client of the registered SessionMgr DLL, late-bound through IDispatch. Two "modules" of
' one script share a custom session: one object for one name, data items attached by one and read
' by the other, and the session lock handed from one to the other.
'
' Run:  wine cscript //nologo <Windows path of this file>   (./scripts/demo.sh does it for you)
' cscript ends silently on a script error, so the last line, "demo.vbs finished", tells that it ran
' to the end. Wine's VBScript cannot read [out] arguments, so the keys here are fixed texts rather
' than keys from GetUniqueKeyName, and GetLockState is left to the C++ demo.
Option Explicit

Dim manager, moduleA, moduleB, id, started
Set manager = CreateObject("SessionMgr.InstrSessionMgr")

WScript.Echo "== One session per name =="
Set moduleA = manager.GetInstrSession("CUSTOM::Bench", False)
Set moduleB = manager.GetInstrSession("custom/bench", False)
If moduleA Is moduleB Then
    WScript.Echo """CUSTOM::Bench"" and ""custom/bench"" give the same object (name """ & moduleB.Name & _
                 """, category """ & moduleB.Category & """)"
Else
    WScript.Echo """CUSTOM::Bench"" and ""custom/bench"" give DIFFERENT objects"
End If

WScript.Echo ""
WScript.Echo "== Data items =="
id = moduleA.GenerateUniqueID()
moduleA.AttachString id, "DUT-4711"
moduleA.AttachLong "Temperature", 23
WScript.Echo "module A attached """ & id & """ = ""DUT-4711"" and ""Temperature"" = 23"
WScript.Echo "module B reads    """ & id & """ = """ & moduleB.GetString(id) & """ and ""Temperature"" = " & _
             moduleB.GetLong("Temperature")
On Error Resume Next
moduleB.AttachLong "Temperature", 99
WScript.Echo "module B attaching ""Temperature"" again: error " & Err.Number & " (&H" & Hex(Err.Number) & ") """ & _
             Err.Description & """"
Err.Clear
On Error GoTo 0

WScript.Echo ""
WScript.Echo "== Lock hand-off between two modules =="
moduleA.LockSession "ModuleA", 5, 0
WScript.Echo "module A locked the session with key ModuleA"
started = Timer
On Error Resume Next
moduleB.LockSession "ModuleB", 1, 0
WScript.Echo "module B waited " & FormatNumber(Timer - started, 1) & " s in LockSession(""ModuleB"", 1 s): error " & _
             Err.Number & " """ & Err.Description & """"
Err.Clear
On Error GoTo 0
moduleA.UnlockSession
WScript.Echo "module A unlocked"
started = Timer
moduleB.LockSession "ModuleB", 5, 0
WScript.Echo "module B locked the session with key ModuleB after " & FormatNumber(Timer - started, 1) & " s"
moduleB.LockSession "moduleb", 0, 0
WScript.Echo "module B entered again at once with key moduleb (keys ignore case, the lock nests)"
moduleB.UnlockSession
moduleB.UnlockSession
WScript.Echo "module B unlocked twice"
moduleA.LockSession "ModuleA", 0, 0
WScript.Echo "module A locked the free session at once (timeout 0)"
moduleA.UnlockSession

WScript.Echo ""
WScript.Echo "== Manager state =="
WScript.Echo manager.StateDescription

Set moduleB = Nothing
Set moduleA = Nothing
Set manager = Nothing
WScript.Echo "demo.vbs finished"
