' A custom session as a late-bound VBScript client meets it: data items and their IDs, the keyed
' session lock, initialize and close, the obsolete and hidden members, the external-process flag.
' Run by run-script.sh, which needs the closing "fails=0" line.
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

Const InvalidOrOutOfRange = -17300
Const UnrecognizedValue = -17304
Const DuplicateItem = -17305
Const TypeMismatch = -17321
Const InvalidPointer = -17346
Const TimedOut = -17402
Const OperationFailed = -17500
Const NotSupportedByObject = 445   ' VBScript's number for E_NOTIMPL

Dim manager
Set manager = CreateObject("SessionMgr.InstrSessionMgr")
Ok "CreateObject SessionMgr.InstrSessionMgr"

' ---- data items -----------------------------------------------------------------------------------
Dim items, id1, id2
Set items = manager.GetInstrSession("CUSTOM::Items", False)
Ok "GetInstrSession CUSTOM::Items"
id1 = items.GenerateUniqueID()
Equal id1, "UniqueId1", "first generated ID"
id2 = items.GenerateUniqueID
Equal id2, "UniqueId2", "second generated ID"
Equal manager.GetInstrSession("CUSTOM::OtherItems", False).GenerateUniqueID(), "UniqueId1", _
      "every session counts its own IDs"

items.AttachLong id1, 42
Ok "AttachLong"
Equal items.GetLong(id1), 42, "GetLong"
items.AttachLong "Negative", -7
Equal items.GetLong("Negative"), -7, "negative long"
items.AttachString "Text", "hello world"
Ok "AttachString"
Equal items.GetString("Text"), "hello world", "GetString"
items.AttachString "Blank", ""
Equal items.GetString("Blank"), "", "empty string item"

items.AttachLong "Text", 1
Fails DuplicateItem, "Duplicate item or value.", "AttachLong with an ID in use"
Equal items.GetString("Text"), "hello world", "a rejected attach keeps the first value"
items.AttachString id1, "x"
Fails DuplicateItem, "Duplicate item or value.", "AttachString with an ID in use by a long"
items.GetLong "Text"
Fails TypeMismatch, "Variable or property types do not match or are not compatible.", "GetLong of a string item"
items.GetString id1
Fails TypeMismatch, "Variable or property types do not match or are not compatible.", "GetString of a long item"
items.GetLong "Missing"
Fails UnrecognizedValue, "Unrecognized value.", "GetLong of an ID never attached"
items.GetString "Missing"
Fails UnrecognizedValue, "Unrecognized value.", "GetString of an ID never attached"
items.GetObject "Missing"
Fails UnrecognizedValue, "Unrecognized value.", "GetObject of an ID never attached"
' Script numbers are never VT_I8 or VT_UI8, the only pointer-sized types.
items.AttachLongPtr "Pointer", 5
Fails InvalidPointer, "Invalid Pointer.", "AttachLongPtr of a 32-bit number"

' IDs are case-sensitive.
items.AttachLong "Key", 1
Ok "AttachLong Key"
items.AttachLong "key", 2
Ok "AttachLong key beside Key"
Equal items.GetLong("Key"), 1, "Key"
Equal items.GetLong("key"), 2, "key"
items.GetLong "KEY"
Fails UnrecognizedValue, "Unrecognized value.", "KEY is a third ID"

items.DetachData "key"
Ok "DetachData key"
items.GetLong "key"
Fails UnrecognizedValue, "Unrecognized value.", "detached item"
Equal items.GetLong("Key"), 1, "DetachData takes only the exact ID"
items.DetachData "Absent"
Ok "DetachData of an ID never attached"
items.DetachData ""
Ok "DetachData of everything"
items.GetLong id1
Fails UnrecognizedValue, "Unrecognized value.", "nothing is left after DetachData """""
Equal items.StateDescription, "   Name: Items, Category: CUSTOM      Initialized: False, In Process" & vbLf, _
      "state text without items"

items.AttachLong "Count", 3
items.AttachString "Label", "DUT 7"
Equal items.StateDescription, "   Name: Items, Category: CUSTOM      Initialized: False, In Process" & vbLf & _
                              "      Data Items: 2" & vbLf & _
                              "         Item #0, Id: Count, DataType: Long: 3" & vbLf & _
                              "         Item #1, Id: Label, DataType: String: DUT 7" & vbLf, _
      "state text with items"

' ---- the session lock -----------------------------------------------------------------------------
' Two modules share one session: each has its own reference and its own key.
Dim moduleA, moduleB, started, waited
Set moduleA = manager.GetInstrSession("CUSTOM::Shared", False)
Set moduleB = manager.GetInstrSession("custom/shared", False)
Ok "two references to CUSTOM::Shared"

moduleA.LockSession "Station", 5, 0
Ok "LockSession Station"
moduleA.LockSession "STATION", 0, 0
Ok "the owner's key in another case enters again at once"
moduleB.LockSession "Other", 0, 0
Fails TimedOut, "Operation Timed Out.", "another key with timeout 0"
started = Timer
moduleB.LockSession "Other", 0.5, 0
waited = Timer - started
Fails TimedOut, "Operation Timed Out.", "another key with timeout 0.5 s"
Report waited >= 0.4, "a timeout of 0.5 s waits before giving up (waited " & waited & " s)"
moduleB.AttachLong "WhileLocked", 1
Ok "the lock is advisory: other members work while it is held"
moduleB.LockSession "", 1, 0
Fails InvalidOrOutOfRange, "Value invalid or out of range.", "empty key"

moduleA.UnlockSession
Ok "first UnlockSession"
moduleB.LockSession "Other", 0, 0
Fails TimedOut, "Operation Timed Out.", "one level is still held after one unlock of two"
moduleA.UnlockSession
Ok "second UnlockSession"
moduleB.LockSession "Other", 0, 0
Ok "free after as many unlocks as locks"
moduleA.LockSession "Station", 0, 0
Fails TimedOut, "Operation Timed Out.", "now the first key is refused"
' Any caller may unlock: no key is given.
moduleA.UnlockSession
Ok "UnlockSession by the other module"
moduleA.UnlockSession
Fails OperationFailed, "Operation Failed.", "UnlockSession while not locked"
moduleA.LockSession "Station", 0, 0
Ok "LockSession on a free session"
moduleA.UnlockSession
Ok "UnlockSession"
Set moduleB = Nothing
Set moduleA = Nothing

' ---- initialize and close -------------------------------------------------------------------------
Dim bench, driver, value
Set bench = manager.GetInstrSession("CUSTOM::Bench", False)
Equal bench.IsInitialized(), False, "a new custom session is not initialized"
bench.Initialize
Ok "Initialize without options"
Equal bench.IsInitialized, True, "initialized"
bench.Initialize "Simulate=1, Whatever=abc"
Ok "Initialize with options"
Equal bench.CloseEnabled, True, "Close is honoured by default"
bench.Close
Ok "Close"
Equal bench.IsInitialized, False, "closed"
bench.CloseEnabled = False
bench.Initialize
bench.Close
Ok "Close while disabled"
Equal bench.IsInitialized, True, "Close does nothing while disabled"
bench.CloseEnabled = True
bench.Close
Equal bench.IsInitialized, False, "Close works again once enabled"
bench.Initialize
Equal bench.IsInitialized, True, "a closed session can be initialized again"
Report InStr(bench.StateDescription, "      Initialized: True, In Process" & vbLf) > 0, "state text shows Initialized: True"

' ---- driver access, obsolete and hidden members ---------------------------------------------------
Set driver = bench.GetCOMDriver(0)
Fails OperationFailed, "Operation Failed.", "GetCOMDriver DefaultInterface"
Set driver = bench.GetCOMDriver(3)
Fails OperationFailed, "Operation Failed.", "GetCOMDriver IODriver"
Set driver = bench.GetCOMDriver(7)
Ok "GetCOMDriver of a level outside the enumeration"
Report driver Is Nothing, "and it gives no driver"

value = bench.CloseFunction
Fails InvalidPointer, "32-bit pointer used with 64-bit platform.", "reading the obsolete CloseFunction"
bench.CloseFunction = 5
Fails InvalidPointer, "32-bit pointer used with 64-bit platform.", "writing the obsolete CloseFunction"
Equal VarType(bench.CloseFunctionEx), 21, "CloseFunctionEx is a VT_UI8"
bench.CloseFunctionEx = 0
Fails InvalidPointer, "Invalid Pointer.", "CloseFunctionEx takes only VT_I8 or VT_UI8"

' GetHandle is hidden, not restricted: scripts reach it (error 445 is E_NOTIMPL, not 438).
bench.GetHandle 0
Fails NotSupportedByObject, "Object doesn't support this action", "hidden GetHandle of a custom session"
bench.GetHandleEx 0
Fails NotSupportedByObject, "Object doesn't support this action", "GetHandleEx of a custom session"
bench.GetVPPBaseInterface
Fails NotSupportedByObject, "Object doesn't support this action", "GetVPPBaseInterface of a custom session"

' ---- identity properties --------------------------------------------------------------------------
Equal bench.InExternalProcess, False, "a session of the calling process"
bench.InExternalProcess = True
Equal bench.InExternalProcess, True, "marked external"
Equal bench.Name, "*Bench", "an external session's name carries the marker"
Equal bench.Category, "CUSTOM", "the category carries none"
Report InStr(bench.StateDescription, "   Name: Bench, Category: CUSTOM      Initialized: True, Out of Process" & vbLf) = 1, _
       "state text: plain name, Out of Process"
Report manager.GetInstrSession("CUSTOM::Bench", False) Is bench, "the marker does not change which name finds it"
bench.InExternalProcess = False
Equal bench.Name, "Bench", "marker gone"

bench.Name = "Renamed"
Ok "put Name"
Report manager.GetInstrSession("CUSTOM::renamed", False) Is bench, "the new name finds the session"
bench.Category = "Elsewhere"
Equal bench.Category, "Elsewhere", "put Category"
bench.Category = "CUSTOM"

Set driver = Nothing
Set bench = Nothing
Set items = Nothing
Set manager = Nothing
Ok "release everything"
WScript.Echo "checks=" & checkCount
WScript.Echo "fails=" & failCount
