' The session manager as a late-bound VBScript client meets it: one object per name whatever the
' case and separator, forced names, name and category errors, hidden categories, the process switches
' and the restricted member. Run by run-script.sh, which needs the closing "fails=0" line.
Option Explicit

' ---- checks (the same block heads every .vbs file here: cscript offers no include) ----------------
Dim failCount, checkCount
failCount = 0
checkCount = 0

Sub Report(passed, what)
    checkCount = checkCount + 1
    If Not passed Then
        failCount = failCount + 1
        WScript.Echo "FAIL: " & what
    End If
End Sub

' Any error left in Err was not expected: a failed statement is skipped under On Error Resume Next,
' so every check first looks at Err.
Function NoError(what)
    NoError = (Err.Number = 0)
    If Not NoError Then Report False, what & ": unexpected error " & Err.Number & " [" & Err.Description & "]"
    Err.Clear
End Function

Sub Ok(what)
    If NoError(what) Then Report True, what
End Sub

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
Const MemberNotFound = 438

Dim manager, sameManager
Set manager = CreateObject("SessionMgr.InstrSessionMgr")
Ok "CreateObject SessionMgr.InstrSessionMgr"
Set sameManager = CreateObject("SessionMgr.InstrSessionMgr.1")
Ok "CreateObject SessionMgr.InstrSessionMgr.1"
Report manager Is sameManager, "both ProgIDs give the process's one manager"
Set sameManager = Nothing

' ---- one object per name ---------------------------------------------------------------------------
Dim bench, other, form
Set bench = manager.GetInstrSession("CUSTOM::Bench", False)
Ok "GetInstrSession CUSTOM::Bench"
Equal bench.Name, "Bench", "name without the category"
Equal bench.Category, "CUSTOM", "category"
bench.AttachString "Owner", "station 1"
Ok "AttachString on CUSTOM::Bench"

' Every separator form, any case, blanks around: the same object, so the item attached through one
' reference is read through the other.
For Each form In Array("CUSTOM::Bench", "custom::bench", "Custom:BENCH", "CUSTOM/Bench", "CUSTOM\Bench", _
                       "CUSTOM//Bench", "CUSTOM/\Bench", "CUSTOM\\Bench", "CUSTOM\/Bench", "CUSTOM:\Bench", _
                       "CUSTOM:/Bench", "CUSTOM:\\Bench", "CUSTOM://Bench", "CUSTOM:/\Bench", "CUSTOM:\/Bench", _
                       "  CUSTOM::Bench  ", vbTab & "custom::Bench" & vbTab)
    Set other = manager.GetInstrSession(form, False)
    If NoError("GetInstrSession " & form) Then
        Report other Is bench, "[" & form & "] gives the CUSTOM::Bench object"
        Equal other.GetString("Owner"), "station 1", "item read through [" & form & "]"
    End If
Next

' A separator is cut once: the third colon belongs to the name, which is another session.
Set other = manager.GetInstrSession("CUSTOM:::Bench", False)
Ok "GetInstrSession CUSTOM:::Bench"
Report Not (other Is bench), "CUSTOM:::Bench is another session"
Equal other.Name, ":Bench", "name after a two-character separator"
Set other = manager.GetInstrSession("CUSTOM::", False)
Equal other.Name, "", "CUSTOM:: names a session with an empty name"
Set other = Nothing

' ---- forced new sessions --------------------------------------------------------------------------
Dim forced2, forced3, lonely
Set forced2 = manager.GetInstrSession("CUSTOM::Bench", True)
Equal forced2.Name, "Bench_2", "first forced session"
Report Not (forced2 Is bench), "a forced session is a new object"
Set forced3 = manager.GetInstrSession("custom::BENCH", True)
Equal forced3.Name, "BENCH_3", "second forced session: the name as asked for, numbered past Bench_2"
Set other = manager.GetInstrSession("CUSTOM::bench_2", False)
Ok "GetInstrSession CUSTOM::bench_2"
Report other Is forced2, "the forced name finds the forced session"
Set other = manager.GetInstrSession("CUSTOM::Bench", False)
Report other Is bench, "the plain name still finds the first session"
Set lonely = manager.GetInstrSession("CUSTOM::Lonely", True)
Equal lonely.Name, "Lonely_2", "a forced name is numbered even without an older session"
Set other = Nothing

' ---- lifetime: the last release ends the session ----------------------------------------------------
Dim temporary
Set temporary = manager.GetInstrSession("CUSTOM::Temporary", False)
temporary.AttachLong "Mark", 1
Ok "AttachLong on CUSTOM::Temporary"
Set temporary = Nothing
Set temporary = manager.GetInstrSession("CUSTOM::Temporary", False)
Ok "GetInstrSession CUSTOM::Temporary again"
temporary.GetLong "Mark"
Fails UnrecognizedValue, "Unrecognized value.", "a session asked for again after its last release is new"
Set temporary = Nothing

' ---- name and category errors ---------------------------------------------------------------------
Set other = manager.GetInstrSession("DAQ::Dev1", False)
Fails UnrecognizedValue, "'DAQ::Dev1' is not a driver session name", "DAQ never has sessions"
Report other Is Nothing, "a failed GetInstrSession assigns nothing"
Set other = manager.GetInstrSession("  DAQ::Dev1 ", False)
Fails &HFFFFBC68, "'DAQ::Dev1' is not a driver session name", "the message quotes the trimmed name"
Set other = manager.GetInstrSession("CUSTOM", False)
Fails UnrecognizedValue, "'CUSTOM' is not a driver session name", "CUSTOM alone is a name, searched and not found"
Set other = manager.GetInstrSession("Dev::X", False)
Fails UnrecognizedValue, "'Dev::X' is not a driver session name", "a prefix that is no category stays in the name"
Set other = manager.GetInstrSession("Nowhere", False)
Fails UnrecognizedValue, "'Nowhere' is not a driver session name", "an unqualified unknown name"

manager.HideCategory "FOO", True
Fails UnrecognizedValue, "'FOO' is not a driver session category", "HideCategory of an unknown category"
manager.HideCategory "RQ", True
Fails UnrecognizedValue, "'RQ' is not a driver session category", "RQ cannot be hidden"
manager.GetNames "FOO", 0, ""
Fails UnrecognizedValue, "'FOO' is not a driver session category", "GetNames of an unknown category"
manager.GetCategories "RQ"
Fails UnrecognizedValue, "'RQ' is not a driver session category", "RQ has no category list"

' A hidden category no longer counts as a prefix: the whole text becomes the name.
manager.HideCategory "CUSTOM", True
Ok "HideCategory CUSTOM"
Set other = manager.GetInstrSession("CUSTOM::Bench", False)
Fails UnrecognizedValue, "'CUSTOM::Bench' is not a driver session name", "CUSTOM hidden"
manager.HideCategory "custom", False
Ok "HideCategory custom, False"
Set other = manager.GetInstrSession("CUSTOM::Bench", False)
Ok "GetInstrSession after showing CUSTOM again"
Report other Is bench, "the live session is found again once CUSTOM is visible"
Set other = Nothing

' ---- the manager's state and switches -------------------------------------------------------------
' Live now: Bench, :Bench released, the empty name released, Bench_2, Bench_3, Lonely_2.
Dim state
state = manager.StateDescription
Ok "manager StateDescription"
Equal Left(state, 18), "In Process State:" & vbLf, "state header of the calling process"
Report InStr(state, vbLf & "Number of Sessions:4" & vbLf) > 0, "four live sessions in: " & state
Report InStr(state, "   Name: Bench, Category: CUSTOM      Initialized: False, In Process" & vbLf & _
                    "      Data Items: 1" & vbLf & _
                    "         Item #0, Id: Owner, DataType: String: station 1" & vbLf) > 0, _
       "Bench and its item in: " & state
Report InStr(state, "   Name: BENCH_3, Category: custom      Initialized: False, In Process" & vbLf) > 0, "a session keeps the category as the caller wrote it"

Equal manager.InExternalProcess, False, "the calling process's manager is not external"
Equal manager.AudibleLifeTimeAlerts, False, "alerts are off at load"
manager.AudibleLifeTimeAlerts = True
Equal manager.AudibleLifeTimeAlerts, True, "alerts switched on"
manager.AudibleLifeTimeAlerts = False
Equal manager.AudibleLifeTimeAlerts, False, "alerts switched off"

' A manager marked external strips the "*" instead of forwarding, marks its sessions and its header.
Dim external
manager.InExternalProcess = True
Equal manager.InExternalProcess, True, "manager marked external"
Set external = manager.GetInstrSession("*CUSTOM::Remote", False)
Ok "GetInstrSession *CUSTOM::Remote on an external manager"
Equal external.Name, "*Remote", "a session of an external manager carries the marker"
Equal external.Category, "CUSTOM", "the category carries no marker"
Equal Left(manager.StateDescription, 22), "Out of Process State:" & vbLf, "state header of an external manager"
manager.InExternalProcess = False
Equal manager.InExternalProcess, False, "manager back in process"
Set other = manager.GetInstrSession("CUSTOM::Remote", False)
Report other Is external, "the marker is not part of the session's name"
Set other = Nothing
Set external = Nothing

' ---- members scripts must not reach ---------------------------------------------------------------
manager.InstallInstrSession "CUSTOM::Installed", bench
Fails MemberNotFound, "Object doesn't support this property or method", "InstallInstrSession is restricted"

Set lonely = Nothing
Set forced3 = Nothing
Set forced2 = Nothing
Set bench = Nothing
Set manager = Nothing
Ok "release everything"
WScript.Echo "checks=" & checkCount
WScript.Echo "fails=" & failCount
