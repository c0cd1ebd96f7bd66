// The manager and a custom session as a late-bound JScript client meets them. JScript reports the
// server's HRESULT itself in e.number (VBScript maps some, E_NOTIMPL to 445), so the codes of the
// E_NOTIMPL members and of the restricted member are pinned here. Run by run-script.sh, which needs
// the closing "fails=0" line.

var failCount = 0;
var checkCount = 0;

function report(passed, what) {
    ++checkCount;
    if (!passed) {
        ++failCount;
        WScript.Echo("FAIL: " + what);
    }
}

function equal(actual, expected, what) {
    report(actual === expected, what + ": got [" + actual + "], expected [" + expected + "]");
}

function hex(number) {
    return "0x" + (number >>> 0).toString(16).toUpperCase();
}

// Runs body, which must throw the given HRESULT with the given description.
function fails(number, description, what, body) {
    try {
        body();
    } catch (e) {
        report(e.number === number && e.description === description,
               what + ": got " + hex(e.number) + " [" + e.description + "], expected " + hex(number) +
               " [" + description + "]");
        return;
    }
    report(false, what + ": no error, expected " + hex(number) + " [" + description + "]");
}

// Runs body, which must not throw.
function ok(what, body) {
    try {
        body();
        report(true, what);
    } catch (e) {
        report(false, what + ": unexpected error " + hex(e.number) + " [" + e.description + "]");
    }
}

var unrecognizedValue = -17304;      // 0xFFFFBC68
var duplicateItem = -17305;
var typeMismatch = -17321;
var invalidPointer = -17346;
var timedOut = -17402;
var operationFailed = -17500;
var notImplemented = -2147467263;    // E_NOTIMPL, 0x80004001
var memberNotFound = -2147352573;    // DISP_E_MEMBERNOTFOUND, 0x80020003

function run() {
    var manager = new ActiveXObject("SessionMgr.InstrSessionMgr");

    // One object per name.
    var bench = manager.GetInstrSession("CUSTOM::JBench", false);
    equal(bench.Name, "JBench", "name");
    equal(bench.Category, "CUSTOM", "category");
    bench.AttachLong("Slot", 3);
    var forms = ["custom::jbench", "Custom:JBench", "CUSTOM/JBench", "CUSTOM\\JBench", "CUSTOM:\\\\JBench", " CUSTOM//JBENCH "];
    for (var i = 0; i < forms.length; ++i) {
        var other = manager.GetInstrSession(forms[i], false);
        report(other === bench, "[" + forms[i] + "] gives the CUSTOM::JBench object");
        equal(other.GetLong("Slot"), 3, "item read through [" + forms[i] + "]");
    }
    var forced = manager.GetInstrSession("CUSTOM::JBench", true);
    equal(forced.Name, "JBench_2", "forced session");
    report(forced !== bench, "a forced session is another object");
    equal(manager.GetInstrSession("CUSTOM::JBench", true).Name, "JBench_3", "second forced session");

    // Errors carry the TE code as HRESULT and the message as description.
    fails(unrecognizedValue, "'DAQ::Dev1' is not a driver session name", "DAQ name",
          function () { manager.GetInstrSession("DAQ::Dev1", false); });
    fails(unrecognizedValue, "'CUSTOM' is not a driver session name", "CUSTOM alone",
          function () { manager.GetInstrSession("CUSTOM", false); });
    fails(unrecognizedValue, "'FOO' is not a driver session category", "unknown category",
          function () { manager.HideCategory("FOO", true); });

    // Data items.
    equal(bench.GenerateUniqueID(), "UniqueId1", "first generated ID");
    equal(bench.GenerateUniqueID(), "UniqueId2", "second generated ID");
    bench.AttachString("Text", "abc");
    equal(bench.GetString("Text"), "abc", "string item");
    fails(duplicateItem, "Duplicate item or value.", "duplicate ID",
          function () { bench.AttachString("Text", "other"); });
    equal(bench.GetString("Text"), "abc", "a rejected attach keeps the first value");
    fails(typeMismatch, "Variable or property types do not match or are not compatible.", "GetLong of a string",
          function () { bench.GetLong("Text"); });
    fails(unrecognizedValue, "Unrecognized value.", "IDs are case-sensitive",
          function () { bench.GetString("text"); });

    // The session lock (JScript passes every argument, reserved included).
    ok("LockSession A", function () { bench.LockSession("KeyA", 0, 0); });
    ok("LockSession a: same key, nested", function () { bench.LockSession("keya", 0, 0); });
    fails(timedOut, "Operation Timed Out.", "another key with timeout 0",
          function () { bench.LockSession("KeyB", 0, 0); });
    ok("UnlockSession", function () { bench.UnlockSession(); });
    ok("UnlockSession", function () { bench.UnlockSession(); });
    ok("LockSession B once free", function () { bench.LockSession("KeyB", 0, 0); });
    ok("UnlockSession", function () { bench.UnlockSession(); });
    fails(operationFailed, "Operation Failed.", "UnlockSession while not locked",
          function () { bench.UnlockSession(); });

    // Initialize and close.
    equal(bench.IsInitialized(), false, "new session not initialized");
    ok("Initialize without options", function () { bench.Initialize(); });
    equal(bench.IsInitialized(), true, "initialized");
    ok("Close", function () { bench.Close(); });
    equal(bench.IsInitialized(), false, "closed");

    // Members without an implementation for a custom session, and the obsolete one.
    fails(notImplemented, "", "hidden GetHandle answers E_NOTIMPL without error info",
          function () { bench.GetHandle(0); });
    fails(notImplemented, "", "GetHandleEx answers E_NOTIMPL", function () { bench.GetHandleEx(0); });
    fails(notImplemented, "", "GetVPPBaseInterface answers E_NOTIMPL", function () { bench.GetVPPBaseInterface(); });
    fails(operationFailed, "Operation Failed.", "GetCOMDriver DefaultInterface", function () { bench.GetCOMDriver(0); });
    fails(invalidPointer, "32-bit pointer used with 64-bit platform.", "obsolete CloseFunction",
          function () { return bench.CloseFunction; });
    fails(invalidPointer, "Invalid Pointer.", "AttachLongPtr of a 32-bit number",
          function () { bench.AttachLongPtr("Pointer", 5); });

    // The external-process flag of a session.
    bench.InExternalProcess = true;
    equal(bench.Name, "*JBench", "external name carries the marker");
    report(bench.StateDescription.indexOf(", Out of Process\n") > 0, "state text says Out of Process");
    bench.InExternalProcess = false;
    equal(bench.Name, "JBench", "marker gone");

    // Restricted: not even visible to a script.
    fails(memberNotFound, "", "InstallInstrSession is restricted",
          function () { manager.InstallInstrSession("CUSTOM::X", bench); });
}

ok("whole script", run);
WScript.Echo("checks=" + checkCount);
WScript.Echo("fails=" + failCount);
