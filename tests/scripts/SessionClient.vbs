' A late-bound VBScript client, for what only a script shows (ProgIDs, identity, Err, hidden and restricted
' members, omitted optional arguments, For Each, property puts). run-script.sh needs the "fails=0" line.
Option Explicit

Dim failCount, checkCount
failCount = 0
checkCount = 0

Sub Report(passed, what)
    checkCount = checkCount + 1
    If Not passed Then failCount = failCount + 1 : WScript.Echo "FAIL: " & what
End Sub

' A failed statement is skipped under On Error Resume Next, so every check first looks at Err.
Function NoError(what)
    NoError = (Err.Number = 0)
    If Not NoError Then Report False, what & ": unexpected error " & Err.Number & " [" & Err.Description & "]"
    Err.Clear
End Function

Sub Equal(actual, expected, what)
    If NoError(what) Then Report actual = expected, what & ": got [" & actual & "], expected [" & expected & "]"
End Sub

Sub Fails(number, description, what)
    Report Err.Number = number And Err.Description = description, what & ": got error " & Err.Number & _
        " [" & Err.Description & "], expected " & number & " [" & description & "]"
    Err.Clear
End Sub

On Error Resume Next

Const UnrecognizedValue = -17304   ' &HFFFFBC68
Const DuplicateItem = -17305
Const MemberNotFound = 438
Const NotSupportedByObject = 445   ' VBScript's number for E_NOTIMPL

Dim manager, sameManager, bench, other, form
Set manager = CreateObject("SessionMgr.InstrSessionMgr")
Set sameManager = CreateObject("SessionMgr.InstrSessionMgr.1")
If NoError("CreateObject by both ProgIDs") Then Report manager Is sameManager, "both ProgIDs give the one manager"

Set bench = manager.GetInstrSession("CUSTOM::Bench", False)
Equal bench.Name, "Bench", "name without the category"
bench.AttachString "Owner", "station 1"
For Each form In Array("custom::bench", "CUSTOM/Bench", "  CUSTOM\\Bench  ")
    Set other = manager.GetInstrSession(form, False)
    If NoError("GetInstrSession " & form) Then Report other Is bench, "[" & form & "] gives the CUSTOM::Bench object"
Next
Equal other.GetString("Owner"), "station 1", "an item attached through one reference, read through another"

' Errors: the TE code in Err.Number, the message in Err.Description; nothing is assigned.
Set other = Nothing
Set other = manager.GetInstrSession("  DAQ::Dev1 ", False)
Fails UnrecognizedValue, "'DAQ::Dev1' is not a driver session name", "DAQ never has sessions"
Report other Is Nothing, "a failed GetInstrSession assigns nothing"
bench.AttachLong "Owner", 1
Fails DuplicateItem, "Duplicate item or value.", "AttachLong with an ID in use"

' An optional argument may be left out; property puts reach the object.
bench.Initialize
Equal bench.IsInitialized(), True, "Initialize without its optional options"
manager.AudibleLifeTimeAlerts = True
Equal manager.AudibleLifeTimeAlerts, True, "alerts switched on"

' GetHandle is hidden, not restricted: scripts reach it (E_NOTIMPL is 445, not 438).
bench.GetHandle 0
Fails NotSupportedByObject, "Object doesn't support this action", "hidden GetHandle of a custom session"
manager.InstallInstrSession "CUSTOM::Installed", bench
Fails MemberNotFound, "Object doesn't support this property or method", "InstallInstrSession is restricted"

Set other = Nothing
Set bench = Nothing
Set sameManager = Nothing
Set manager = Nothing
NoError "release everything"
WScript.Echo "checks=" & checkCount
WScript.Echo "fails=" & failCount
