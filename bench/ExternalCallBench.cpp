// What the shared external process costs a client: the first forwarded request (which starts the
// server), then the per-call cost of a forwarded GetInstrSession and of a call on a session that
// lives in the external process, each beside the same call in this process. Prints medians and
// ratios, and the row
//
//   P6  forwarded GetInstrSession / a bare marshalled call to the same server (its ProcessId),
//       medians of batches that alternate so that both see the same load
//
//   wine bench_external_call.exe [calls]      (default 500; DLL and server must be registered)
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "BenchReport.h"
#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"
#include "manager/ExternalProcessServer.h"

using namespace sm;

namespace {

using Clock = std::chrono::steady_clock;

void Check(HRESULT result, const char* what) {
    if (FAILED(result)) {
        std::printf("%s failed: HRESULT 0x%08lX\n", what, static_cast<unsigned long>(result));
        std::exit(1);
    }
}

double Microseconds(Clock::duration duration) { return std::chrono::duration<double, std::micro>(duration).count(); }

template <class Call>
double MedianMicroseconds(int count, Call&& call) {
    std::vector<double> samples;
    for (int round = 0; round < count; ++round) {
        auto start = Clock::now();
        call();
        samples.push_back(Microseconds(Clock::now() - start));
    }
    std::sort(samples.begin(), samples.end());
    return samples[samples.size() / 2];
}

ComPtr<IInstrSession> Session(IInstrSessionMgr* manager, const wchar_t* name) {
    UniqueBstr text(::SysAllocString(name));
    ComPtr<IInstrSession> session;
    Check(manager->GetInstrSession(text.Get(), VARIANT_FALSE, session.Put()), "GetInstrSession");
    return session;
}

}  // namespace

int main(int argc, char** argv) {
    int calls = argc > 1 ? std::max(1, std::atoi(argv[1])) : 500;
    Check(::CoInitializeEx(nullptr, COINIT_MULTITHREADED), "CoInitializeEx");
    {
        ComPtr<IInstrSessionMgr> manager;
        Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                 manager.PutVoid()),
              "CoCreateInstance");
        auto local = Session(manager.Get(), L"CUSTOM::Bench");
        auto start = Clock::now();
        auto external = Session(manager.Get(), L"*CUSTOM::Bench");
        double firstActivation = Microseconds(Clock::now() - start);

        double localGet = MedianMicroseconds(calls, [&] { Session(manager.Get(), L"CUSTOM::Bench"); });
        double forwardedGet = MedianMicroseconds(calls, [&] { Session(manager.Get(), L"*CUSTOM::Bench"); });
        UniqueBstr id(::SysAllocString(L"Value"));
        Check(local->AttachLong(id.Get(), 1), "AttachLong");
        Check(external->AttachLong(id.Get(), 1), "AttachLong");
        LONG value = 0;
        double localCall = MedianMicroseconds(calls, [&] { local->GetLong(id.Get(), &value); });
        double externalCall = MedianMicroseconds(calls, [&] { external->GetLong(id.Get(), &value); });

        // P6: the server's own no-op property against the forwarded hit, in alternating batches.
        ComPtr<IExternalProcessServer> server;
        Check(::CoCreateInstance(CLSID_ExternalProcessServer, nullptr, CLSCTX_LOCAL_SERVER, IID_IExternalProcessServer,
                                 server.PutVoid()),
              "CoCreateInstance(ExternalProcessServer)");
        LONG processId = 0;
        std::vector<double> forwarded, bare;
        int batch = std::max(1, calls / 10);
        for (int round = 0; round < 10; ++round) {
            forwarded.push_back(MedianMicroseconds(batch, [&] { Session(manager.Get(), L"*CUSTOM::Bench"); }));
            bare.push_back(MedianMicroseconds(batch, [&] { server->get_ProcessId(&processId); }));
        }
        std::sort(forwarded.begin(), forwarded.end());
        std::sort(bare.begin(), bare.end());
        double forwardedMedian = forwarded[forwarded.size() / 2], bareMedian = bare[bare.size() / 2];
        char figure[32], reference[32];
        std::snprintf(figure, sizeof figure, "%.0f us", forwardedMedian);
        std::snprintf(reference, sizeof reference, "%.0f us", bareMedian);
        bench::Row("P6", "forwarded GetInstrSession(\"*CUSTOM::Bench\") through the external-process server", figure,
                   "bare marshalled call to the same server (ProcessId)", reference, forwardedMedian / bareMedian,
                   "<= 1.2");

        std::printf("first forwarded request (starts the server): %.1f ms\n", firstActivation / 1000.0);
        std::printf("GetInstrSession, this process:     %9.2f us median of %d\n", localGet, calls);
        std::printf("GetInstrSession, forwarded:        %9.2f us median  (x%.0f)\n", forwardedGet, forwardedGet / localGet);
        std::printf("GetLong on a session, this process: %8.2f us median\n", localCall);
        std::printf("GetLong on a session, external:    %9.2f us median  (x%.0f)\n", externalCall, externalCall / localCall);
    }
    ::CoUninitialize();
    return 0;
}
