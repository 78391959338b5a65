#include "transfer/download_dialog.h"

#include "base/resource_ids.h"
#include "base/window_messages.h"
#include "helpers/error_reporter.h"
#include "helpers/file_helpers.h"
#include "helpers/filelog.h"
#include "store/string_table.h"

namespace {
constexpr int kTimeout = 30;
constexpr int kReceiveWait = 20;
constexpr UINT kWarningBox = MB_OK | MB_ICONEXCLAMATION;  // 48
}  // namespace

CDownloadProgressDialog::CDownloadProgressDialog(HWND parent, const CStationRecord& level,
                                                 const std::wstring& targetPath)
    : CDialog(IDD_DOWNLOAD, parent), Level(level), TargetPath(targetPath) {
  MapMessage(DownloadMessage, [this](WPARAM w, LPARAM l) { return OnDownloadMessage(w, l); });
  MapCommand(IDC_TRANSFER_START, [this] { OnStart(); });
}

CDownloadProgressDialog::~CDownloadProgressDialog() {
  // The library may use the block until its object is gone: destroy first, then free.
  if (Comm) Comm->Destroy(1);
  Comm = nullptr;
  DeletePointsBlock(Points);
  Points = nullptr;
}

void CDownloadProgressDialog::DoDataExchange(bool toControls) {
  CDialog::DoDataExchange(toControls);
  DdxText(toControls, IDC_TRANSFER_INSTRUCTIONS, Instructions);
  DdxText(toControls, IDC_TRANSFER_STATUS, StatusText);
  DdxText(toControls, IDC_TRANSFER_NAME, LevelName);
}

void CDownloadProgressDialog::PostNcDestroy() { DownloadDialogWindow = nullptr; }

BOOL CDownloadProgressDialog::OnInitDialog() {
  BOOL result = CDialog::OnInitDialog();
  SendMessageW(Item(IDC_TRANSFER_INSTRUCTIONS), WM_SETFONT,
               reinterpret_cast<WPARAM>(GetStockObject(DEFAULT_GUI_FONT)), TRUE);
  DownloadDialogWindow = Handle();

  Instructions = LoadTranslatedString(IDS_INSTRUCTIONS_PREFIX);
  static constexpr UINT kModels[][2] = {{IDS_MODEL_HRA20, IDS_INSTRUCTIONS_HRA20},
                                        {IDS_MODEL_HRA40, IDS_INSTRUCTIONS_HRA40},
                                        {IDS_MODEL_HRB1X, IDS_INSTRUCTIONS_HRB1X}};
  for (const auto& model : kModels) {
    if (Level.Model == LoadTranslatedString(model[0])) {
      Instructions += LoadTranslatedString(model[1]);
      break;
    }
  }
  LevelName = Level.Name;
  StatusText = LoadTranslatedString(IDS_WAITING_FOR_START);
  UpdateData(true);

  SetDlgItemTextW(Handle(), IDC_TRANSFER_STATUS_LABEL, LoadTranslatedString(IDS_LABEL_STATUS).c_str());
  SetDlgItemTextW(Handle(), IDC_TRANSFER_NAME_LABEL, LoadTranslatedString(IDS_LABEL_FILE_NAME).c_str());
  SetDlgItemTextW(Handle(), IDC_TRANSFER_START, LoadTranslatedString(IDS_START).c_str());
  SetDlgItemTextW(Handle(), IDCANCEL, LoadTranslatedString(IDS_CANCEL).c_str());
  SetWindowTextW(Handle(), LoadTranslatedString(IDS_DOWNLOAD_TITLE).c_str());
  return result;
}

void CDownloadProgressDialog::SetStatus(UINT stringId) {
  StatusText = LoadTranslatedString(stringId);
  UpdateData(true);
}

void CDownloadProgressDialog::FailureExit(const std::wstring& text) {
  kld::ft::LogTextA("Download: failed, the user reads \"%ls\"", text.c_str());
  MessageBoxW(Handle(), text.c_str(), LoadTranslatedString(IDS_ROOT_NAME).c_str(), kWarningBox);
  EndDialog(IDCANCEL);
}

bool CDownloadProgressDialog::StartTransfer() {
  if (Comm) {
    // A second Start (only by a command sent from outside): the old object goes first.
    Comm->Destroy(1);
    Comm = nullptr;
  }
  std::wstring error;
  Comm = CreateCommObject(error);
  if (!Comm) {
    FailureExit(error);
    return false;
  }
  kld::ft::LogTextA("Download: the instrument library is loaded");
  Comm->Initialize();
  Comm->SetCallback(&CommResultCallback);
  // The library may call back after the dialog, and every object of ours, is gone: the
  // code it calls must stay in the process for good.
  HMODULE self = nullptr;
  GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_PIN | GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS,
                     reinterpret_cast<LPCWSTR>(&CommResultCallback), &self);

  char narrowPath[MAX_PATH] = {};
  WideCharToMultiByte(CP_THREAD_ACP, 0, TargetPath.c_str(), -1, narrowPath, MAX_PATH, nullptr,
                      nullptr);
  narrowPath[MAX_PATH - 1] = '\0';
  // Each answer of the library goes to the log before it is judged.
  const auto answered = [](const char* step, int answer) {
    kld::ft::LogTextA("Download: %s answered %d", step, answer);
    return answer;
  };
  if (answered("SetFilePath", Comm->SetFilePath(narrowPath)) != 0) {
    FailureExit(LoadTranslatedString(IDS_ERR_SET_FILE_PATH));
    return false;
  }
  if (answered("SetTimeout", Comm->SetTimeout(kTimeout)) != 0) {
    FailureExit(LoadTranslatedString(IDS_ERR_SET_TIMEOUT));
    return false;
  }
  DeletePointsBlock(Points);
  Points = NewPointsBlock();
  if (!Points) {
    FailureExit(kld::ft::BuildErrorText(E_OUTOFMEMORY, nullptr, nullptr, nullptr));
    return false;
  }
  if (answered("SetPoints", Comm->SetPoints(Points)) != 0) {
    FailureExit(LoadTranslatedString(IDS_ERR_SET_POINTS));
    return false;
  }
  // The library takes parity before stop bits and flow before data bits.
  if (answered("SetCommParameters", Comm->SetCommParameters(Level.Port, Level.BaudRate, Level.Parity, Level.StopBits,
                                                            Level.Flow, Level.DataBits, Level.CheckSum)) != 0) {
    FailureExit(LoadTranslatedString(IDS_ERR_SET_COMM_PARAMS));
    return false;
  }
  int received = answered("ReceiveFile", Comm->ReceiveFile(kReceiveWait, true));
  if (received != 0) {
    FailureExit(CommResultText(received));
    return false;
  }
  return true;
}

void CDownloadProgressDialog::OnStart() {
  kld::ft::LogTextA("Download: Start pressed");
  if (!StartTransfer()) return;
  SetStatus(IDS_WAITING_FOR_DOWNLOAD);
  EnableWindow(Item(IDC_TRANSFER_START), FALSE);
}

LRESULT CDownloadProgressDialog::OnDownloadMessage(WPARAM, LPARAM lParam) {
  int code = static_cast<int>(lParam);
  kld::ft::LogTextA("Download: the instrument's transfer ended with %d", code);
  if (code != 0) {
    FailureExit(CommResultText(code));
    return 0;
  }
  PostMessageW(Handle(), WM_COMMAND, IDOK, 0);
  SetStatus(IDS_FINISHING_DOWNLOAD);
  return 0;
}

void CDownloadProgressDialog::OnCancel() {
  if (!Comm) {
    CDialog::OnCancel();
    return;
  }
  SetStatus(IDS_TERMINATING);
  kld::ft::LogTextA("Download: cancelled by the user, the connection is ended");
  Comm->TerminateConnection();
}

DWORD MakeDownloadTargetPath(std::wstring& target) {
  // The folder limit is 130 on purpose, leaving room behind it in 260-character buffers.
  wchar_t folder[130] = {};
  if (GetTempPathW(130, folder) == 0) return GetLastError();
  wchar_t name[MAX_PATH] = {};
  if (GetTempFileNameW(folder, L"TKF", 0, name) == 0) return GetLastError();
  DeleteFileW(name);  // only the unique name was wanted
  target = kld::ft::GetDirectoryPart(name) + kld::ft::GetTitlePart(name);
  return 0;
}
