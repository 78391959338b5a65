// The modal dialog that receives one job from a digital level into a file.
#pragma once
#include <windows.h>
#include <string>

#include "base/dialog_base.h"
#include "store/station_record.h"
#include "transfer/comm_interface.h"

class CDownloadProgressDialog : public CDialog {
 public:
  // The record and the path are copied; the path has no extension (the library adds ".txt").
  CDownloadProgressDialog(HWND parent, const CStationRecord& level, const std::wstring& targetPath);
  ~CDownloadProgressDialog() override;

  // 1 after a good end, 2 after a failure or a cancel (-1 if the dialog could not be made).
  using CDialog::DoModal;

 protected:
  void DoDataExchange(bool toControls) override;
  void PostNcDestroy() override;
  BOOL OnInitDialog() override;
  void OnCancel() override;

 private:
  void OnStart();
  LRESULT OnDownloadMessage(WPARAM wParam, LPARAM lParam);
  void SetStatus(UINT stringId);
  void FailureExit(const std::wstring& text);
  // Steps of the transfer up to ReceiveFile; false after a failure exit.
  bool StartTransfer();

  CStationRecord Level;
  std::wstring Instructions;
  std::wstring StatusText;
  std::wstring LevelName;
  std::wstring TargetPath;
  IMarlixComm* Comm = nullptr;
  PointsBlock* Points = nullptr;
};

// Makes a unique path without extension in the temporary folder ("TKF" prefix).
// 0, or the bare GetLastError value when the folder or the name could not be had.
DWORD MakeDownloadTargetPath(std::wstring& target);
