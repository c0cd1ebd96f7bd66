/* A driver image for directory scans: every export of its .def file points at this one function,
   so a scan sees exactly the export names the test chose and nothing else. */
__declspec(dllexport) int ExportOnlyDriverEntry(void) { return 0; }
