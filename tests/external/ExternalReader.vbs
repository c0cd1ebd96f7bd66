' Reads, from a script process, the item a C++ client process attached to "*CUSTOM::Station".
Set session = CreateObject("SessionMgr.InstrSessionMgr").GetInstrSession("*CUSTOM::Station", False)
WScript.Echo "read=" & session.GetLong("Counter") & " name=" & session.Name
