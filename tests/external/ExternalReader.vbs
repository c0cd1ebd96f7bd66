' Reads, from a script process, the data item that a C++ client process attached to the shared
' session "*CUSTOM::Station" in the external process.
Dim manager, session
Set manager = CreateObject("SessionMgr.InstrSessionMgr")
Set session = manager.GetInstrSession("*CUSTOM::Station", False)
WScript.Echo "read=" & session.GetLong("Counter")
WScript.Echo "name=" & session.Name
WScript.Echo "fails=0"
