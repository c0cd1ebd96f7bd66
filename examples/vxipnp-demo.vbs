' A VBScript client on a VXIplug&play instrument, late-bound: the logical name DMM1 and the virtual
' instrument BenchDMM give one session, GetHandleEx gives the driver's handle, and IVPPBase resets the
' instrument. (Wine's VBScript cannot read [out] arguments, so the standard functions that give texts
' are shown by VxipnpDemo.exe.) ./scripts/demo.sh installs the simulated driver first.
Option Explicit

Dim manager, byLogicalName, byInstrument, vpp
Set manager = CreateObject("SessionMgr.InstrSessionMgr")
Set byLogicalName = manager.GetInstrSession("VXIPNP::DMM1", False)
Set byInstrument = manager.GetInstrSession("VXIPNP::BenchDMM", False)
If byLogicalName Is byInstrument Then
    WScript.Echo """VXIPNP::DMM1"" and ""VXIPNP::BenchDMM"" give the same session"
Else
    WScript.Echo """VXIPNP::DMM1"" and ""VXIPNP::BenchDMM"" give DIFFERENT sessions"
End If
WScript.Echo "GetHandleEx(0) = &H" & Hex(byLogicalName.GetHandleEx(0)) & " (" & TypeName(byLogicalName.GetHandleEx(0)) & ")"
Set vpp = byInstrument.GetVPPBaseInterface()
WScript.Echo "IVPPBase.Reset gives status " & vpp.Reset()
WScript.Echo "IsInitialized = " & byInstrument.IsInitialized()
byInstrument.Close
WScript.Echo "after Close: IsInitialized = " & byInstrument.IsInitialized() & ", Reset gives status " & vpp.Reset() & _
             ", IsInitialized = " & byInstrument.IsInitialized()

Set vpp = Nothing
Set byInstrument = Nothing
Set byLogicalName = Nothing
Set manager = Nothing
WScript.Echo "vxipnp-demo.vbs finished"
