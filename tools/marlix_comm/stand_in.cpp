// A stand-in for the instrument's communication library: honours the contract of
// IMarlixComm, simulates a level that sends one job, and logs every call.
#include <windows.h>
#include <cstdarg>
#include <cstdio>
#include <string>
#include <vector>

#include "stand_in_files.h"
#include "survey_job.h"
#include "transfer/comm_interface.h"

namespace standin {
namespace {

// How many of the block's 10000 preset fields still hold -1.
int IntactMarks(const PointsBlock* block) {
  int intact = 0;
  for (const PointRecord& record : block->Records) {
    if (record.Mark1 == -1) ++intact;
    if (record.Mark2 == -1) ++intact;
  }
  return intact;
}

class StandInComm final : public IMarlixComm {
 public:
  StandInComm() : settings_(Settings::Load()) {
    terminate_ = CreateEventW(nullptr, FALSE, FALSE, nullptr);
    stop_ = CreateEventW(nullptr, TRUE, FALSE, nullptr);
  }

  void Destroy(unsigned flags) override {
    if (points_) {
      int intact = IntactMarks(points_);
      Log(Format("Destroy %u points=%s", flags, intact == 2 * kPointRecordCount ? "intact" : "broken"));
    } else {
      Log(Format("Destroy %u", flags));
    }
    SetEvent(stop_);
    // Nothing is freed while a worker may still touch it.
    for (HANDLE worker : workers_) {
      WaitForSingleObject(worker, INFINITE);
      CloseHandle(worker);
    }
    CloseHandle(terminate_);
    CloseHandle(stop_);
    if (flags & 1) delete this;
  }

  int SetCommParameters(int port, int baudRate, int parity, int stopBits, int flow, int dataBits,
                        int checkSum) override {
    Log(Format("SetCommParameters %d %d %d %d %d %d %d", port, baudRate, parity, stopBits, flow,
               dataBits, checkSum));
    return settings_.Number("result.SetCommParameters", 0);
  }

  int Initialize() override {
    Log("Initialize");
    return 0;
  }

  int ReceiveFile(int wait, bool flag) override {
    Log(Format("ReceiveFile %d %s", wait, flag ? "true" : "false"));
    int result = settings_.Number("result.ReceiveFile", 0);
    if (result != 0) return result;
    // Every started transfer ends in a callback, a second one as the first.
    HANDLE worker = CreateThread(nullptr, 0, &StandInComm::Worker, this, 0, nullptr);
    if (!worker) return -201;
    workers_.push_back(worker);
    return 0;
  }

  int SetPoints(PointsBlock* block) override {
    points_ = block;
    int intact = block ? IntactMarks(block) : 0;
    Log(Format("SetPoints preset=%d", intact));
    return settings_.Number("result.SetPoints", 0);
  }

  int TerminateConnection() override {
    Log("TerminateConnection");
    InterlockedIncrement(&terminations_);
    SetEvent(terminate_);
    return 0;
  }

  int SetFilePath(const char* path) override {
    path_ = path ? path : "";
    Log("SetFilePath " + path_);
    return settings_.Number("result.SetFilePath", 0);
  }

  int SetTimeout(int timeout) override {
    Log(Format("SetTimeout %d", timeout));
    return settings_.Number("result.SetTimeout", 0);
  }

  int SetCallback(CommResultCallbackFn callback) override {
    callback_ = callback;
    Log(callback ? "SetCallback set" : "SetCallback null");
    return 0;
  }

  // Positions the system never calls.
  void Unused1() override { Log("Unused1"); }
  void Unused5() override { Log("Unused5"); }
  void Unused7() override { Log("Unused7"); }
  void Unused11() override { Log("Unused11"); }
  void Unused12() override { Log("Unused12"); }

 private:
  ~StandInComm() = default;

  static DWORD WINAPI Worker(void* self) {
    static_cast<StandInComm*>(self)->Run();
    return 0;
  }

  // The surveyor presses Enter after the delay, unless the line is terminated first.
  void Run() {
    int code;
    HANDLE events[] = {terminate_, stop_};
    // With wait_for_terminate=N the level stays silent until the N-th TerminateConnection.
    const long needed = settings_.Number("wait_for_terminate", 0);
    DWORD delay = needed > 0 ? INFINITE : static_cast<DWORD>(settings_.Number("delay_ms", 3000));
    DWORD woke;
    do {
      woke = WaitForMultipleObjects(2, events, FALSE, delay);
    } while (woke == WAIT_OBJECT_0 && needed > 0 && terminations_ < needed);
    if (woke == WAIT_OBJECT_0) {
      code = settings_.Number("terminate_code", kCommInterrupted);
    } else if (woke == WAIT_TIMEOUT) {
      code = settings_.Number("callback_code", 0);
      if (code == 0 && !WriteJob()) code = -201;
    } else {
      Log("Abandoned");
      return;
    }
    Report(code, "");
    if (settings_.Number("late_callback", 0)) {
      // Once more after the object (and so the dialog) is gone.
      WaitForSingleObject(stop_, 30000);
      Report(code, " late");
    }
  }

  void Report(int code, const char* note) {
    Log(Format("Callback %d%s", code, note));
    if (callback_) callback_(code);
  }

  bool WriteJob() {
    std::string job = MakeSurveyJob(static_cast<size_t>(settings_.Number("job_bytes", 0)));
    std::string target = path_ + ".txt";
    HANDLE file = CreateFileA(target.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS,
                              FILE_ATTRIBUTE_NORMAL, nullptr);
    if (file == INVALID_HANDLE_VALUE) return false;
    DWORD written = 0;
    BOOL ok = WriteFile(file, job.data(), static_cast<DWORD>(job.size()), &written, nullptr);
    CloseHandle(file);
    Log(Format("Wrote %lu bytes", static_cast<unsigned long>(written)));
    return ok && written == job.size();
  }

  Settings settings_;
  std::string path_;
  CommResultCallbackFn callback_ = nullptr;
  PointsBlock* points_ = nullptr;
  HANDLE terminate_ = nullptr;
  HANDLE stop_ = nullptr;
  std::vector<HANDLE> workers_;
  volatile LONG terminations_ = 0;
};

}  // namespace
}  // namespace standin

#ifndef MARLIX_COMM_NO_EXPORT
extern "C" __declspec(dllexport) IMarlixComm* CreateInstance() {
  standin::Log("CreateInstance");
  return new standin::StandInComm();
}
#endif
