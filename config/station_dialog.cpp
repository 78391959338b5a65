#include "config/station_dialog.h"

#include <algorithm>
#include <climits>
#include <cwchar>

#include <shlwapi.h>

#include "base/resource_ids.h"
#include "base/win_handles.h"
#include "base/dialog_base.h"
#include "store/string_table.h"

namespace {

constexpr WPARAM kApplyCommand = 12321;  // the platform sheet's Apply button

std::wstring Format(const wchar_t* format, int value) {
  wchar_t text[32] = {};
  wnsprintfW(text, 32, format, value);  // Windows' formatter: the C library's would bring a printf
  return text;
}

// The integer value of a text as the C library reads it: leading digits, 0 if none.
int IntegerOf(const std::wstring& text) {
  long value = std::wcstol(text.c_str(), nullptr, 10);
  return static_cast<int>(std::clamp<long>(value, INT_MIN, INT_MAX));
}

// A decimal text as the C locale reads it, whatever locale the host process has set: the
// stop bits "1.5" must not become 1 in a host that writes decimal commas.
double DecimalOf(const std::wstring& text) {
  size_t at = text.find_first_not_of(L" \t\r\n\v\f");
  if (at == std::wstring::npos) return 0;
  const bool negative = text[at] == L'-';
  if (text[at] == L'-' || text[at] == L'+') ++at;
  double digits = 0, scale = 1;
  bool point = false;
  for (; at < text.size(); ++at) {
    if (text[at] >= L'0' && text[at] <= L'9') {
      digits = digits * 10 + (text[at] - L'0');
      if (point) scale *= 10;
    } else if (text[at] == L'.' && !point) {
      point = true;
    } else {
      break;
    }
  }
  return (negative ? -digits : digits) / scale;
}

void SetLabel(HWND page, int id, UINT stringId) {
  SetDlgItemTextW(page, id, LoadTranslatedString(stringId).c_str());
}

void AddTranslated(const CComboBox& list, std::initializer_list<UINT> stringIds) {
  for (UINT id : stringIds) list.AddString(LoadTranslatedString(id));
}

// The duplicate message: string 1023 with the name in place of its %s, at most 259 characters.
// The name is put in by hand: a translated text could carry other format directives.
std::wstring DuplicateText(const std::wstring& name) {
  std::wstring text = LoadTranslatedString(IDS_LEVEL_EXISTS);
  size_t at = text.find(L"%s");
  if (at != std::wstring::npos) text.replace(at, 2, name);
  if (text.size() > MAX_PATH - 1) text.resize(MAX_PATH - 1);
  return text;
}

}  // namespace

int EnumSerialPorts(std::vector<std::wstring>& ports) {
  win::UniqueHKey key;
  if (RegOpenKeyExW(HKEY_LOCAL_MACHINE, L"HARDWARE\\DEVICEMAP\\SERIALCOMM", 0, KEY_QUERY_VALUE, key.Put()) !=
      ERROR_SUCCESS)
    return 0;
  int count = 0;
  for (DWORD index = 0;; ++index) {
    wchar_t name[64];
    wchar_t data[64 + 1] = {};  // 128 bytes for the value, and a terminator of our own behind them
    DWORD nameLength = 64;
    DWORD dataSize = 128;
    DWORD type = REG_NONE;
    if (RegEnumValueW(key.Get(), index, name, &nameLength, nullptr, &type, reinterpret_cast<BYTE*>(data), &dataSize) !=
            ERROR_SUCCESS ||
        type != REG_SZ)
      break;
    ports.emplace_back(data, wcsnlen(data, dataSize / sizeof(wchar_t)));
    ++count;
  }
  return count;
}

int PortNumberOf(const std::wstring& portText) {
  size_t digit = portText.find_first_of(L"0123456789");
  return IntegerOf(digit == std::wstring::npos ? portText : portText.substr(digit));
}

// General page

CStationPage::CStationPage(UINT templateId, int newLevel, CStationRecord* record, std::initializer_list<Change> changes)
    : CPropertyPage(templateId), NewLevel(newLevel), Record(record) {
  for (const Change& change : changes) MapNotification(change.control, change.code, [this] { OnChange(); });
}

void CStationPage::OnChange() {
  if (!NewLevel && !initializing_) SetModified(true);
}

CStationGeneralPage::CStationGeneralPage(int newLevel, CStationRecord* record)
    : CStationPage(IDD_STATION_GENERAL, newLevel, record,
                   {{IDC_STATION_NAME, EN_CHANGE},
                    {IDC_STATION_NOTE, EN_CHANGE},
                    {IDC_STATION_PORT, CBN_SELCHANGE},
                    {IDC_STATION_MODEL, CBN_SELCHANGE}}) {}

void CStationGeneralPage::DoDataExchange(bool toControls) {
  CPropertyPage::DoDataExchange(toControls);
  PortList.Attach(Item(IDC_STATION_PORT));
  ModelList.Attach(Item(IDC_STATION_MODEL));
  DdxText(toControls, IDC_STATION_NAME, NameText);
  DdxText(toControls, IDC_STATION_NOTE, NoteText);
  DdxComboExact(toControls, IDC_STATION_PORT, PortText);
  DdxComboExact(toControls, IDC_STATION_MODEL, ModelText);
  if (toControls) return;
  Record->Name = NameText;
  Record->Manufacturer = NoteText;
  Record->Model = ModelText;
  Record->Port = PortNumberOf(PortText);
}

BOOL CStationGeneralPage::OnInitDialog() {
  initializing_ = true;
  BOOL result = CPropertyPage::OnInitDialog();
  PortList.Attach(Item(IDC_STATION_PORT));
  ModelList.Attach(Item(IDC_STATION_MODEL));

  std::vector<std::wstring> ports;
  EnumSerialPorts(ports);
  // A port that is gone today (an adapter unplugged) still shows, so that an OK that didn't
  // touch it stores it back as it was.
  PortText = Format(L"COM%d", Record->Port);
  if (std::find(ports.begin(), ports.end(), PortText) == ports.end()) ports.push_back(PortText);
  std::sort(ports.begin(), ports.end());  // ordinal; the list sorts again by its own rule
  for (const std::wstring& port : ports) PortList.AddString(port);

  SetLabel(Handle(), IDC_LABEL_NAME, IDS_LABEL_NAME);
  SetLabel(Handle(), IDC_LABEL_NOTE, IDS_LABEL_NOTE);
  SetLabel(Handle(), IDC_LABEL_PORT, IDS_LABEL_PORT);
  SetLabel(Handle(), IDC_LABEL_MODEL, IDS_LABEL_MODEL);
  AddTranslated(ModelList, {IDS_MODEL_HRA20, IDS_MODEL_HRA40, IDS_MODEL_HRB1X});

  // No more than the store can read back.
  SendMessageW(Item(IDC_STATION_NAME), EM_LIMITTEXT, kMaxStationNameLength, 0);
  SendMessageW(Item(IDC_STATION_NOTE), EM_LIMITTEXT, kMaxStationTextLength, 0);
  NameText = Record->Name;
  NoteText = Record->Manufacturer;
  ModelText = Record->Model;
  UpdateData(true);
  initializing_ = false;
  return result;
}

// Filling the controls sends the same notifications as typing; only the user's changes count.

// Advanced page

CStationAdvancedPage::CStationAdvancedPage(int newLevel, CStationRecord* record)
    : CStationPage(IDD_STATION_ADVANCED, newLevel, record,
                   {{IDC_STATION_BAUD, CBN_SELCHANGE},
                    {IDC_STATION_PARITY, CBN_SELCHANGE},
                    {IDC_STATION_DATABITS, CBN_SELCHANGE},
                    {IDC_STATION_STOPBITS, CBN_SELCHANGE},
                    {IDC_STATION_FLOW, CBN_SELCHANGE},
                    {IDC_STATION_CHECKSUM, CBN_SELCHANGE}}) {}

void CStationAdvancedPage::DoDataExchange(bool toControls) {
  CPropertyPage::DoDataExchange(toControls);
  BaudList.Attach(Item(IDC_STATION_BAUD));
  ParityList.Attach(Item(IDC_STATION_PARITY));
  DataBitsList.Attach(Item(IDC_STATION_DATABITS));
  StopBitsList.Attach(Item(IDC_STATION_STOPBITS));
  FlowList.Attach(Item(IDC_STATION_FLOW));
  CheckSumList.Attach(Item(IDC_STATION_CHECKSUM));
  DdxComboPrefix(toControls, IDC_STATION_PARITY, ParityText);
  DdxComboPrefix(toControls, IDC_STATION_BAUD, BaudText);
  DdxComboPrefix(toControls, IDC_STATION_DATABITS, DataBitsText);
  DdxComboPrefix(toControls, IDC_STATION_STOPBITS, StopBitsText);
  DdxComboPrefix(toControls, IDC_STATION_FLOW, FlowText);
  DdxComboPrefix(toControls, IDC_STATION_CHECKSUM, CheckSumText);
  if (toControls) return;

  Record->BaudRate = IntegerOf(BaudText);
  Record->DataBits = IntegerOf(DataBitsText);
  if (ParityText == LoadTranslatedString(IDS_PARITY_NONE)) Record->Parity = 0;
  else if (ParityText == LoadTranslatedString(IDS_PARITY_ODD)) Record->Parity = 2;
  else if (ParityText == LoadTranslatedString(IDS_PARITY_EVEN)) Record->Parity = 1;
  const double stopBits = DecimalOf(StopBitsText);
  Record->StopBits = stopBits == 2.0 ? 2 : stopBits == 1.5 ? 15 : 1;
  Record->Flow = FlowText == LoadTranslatedString(IDS_FLOW_XONXOFF) ? 1 : 0;
  Record->CheckSum = CheckSumText == LoadTranslatedString(IDS_CHECKSUM_SET) ? 1 : 0;
}

BOOL CStationAdvancedPage::OnInitDialog() {
  initializing_ = true;
  BOOL result = CPropertyPage::OnInitDialog();
  HWND page = Handle();
  SetLabel(page, IDC_LABEL_BAUD, IDS_LABEL_BAUDRATE);
  SetLabel(page, IDC_LABEL_PARITY, IDS_LABEL_PARITY);
  SetLabel(page, IDC_LABEL_DATABITS, IDS_LABEL_DATABITS);
  SetLabel(page, IDC_LABEL_STOPBITS, IDS_LABEL_STOPBITS);
  SetLabel(page, IDC_LABEL_FLOW, IDS_LABEL_FLOW);
  SetLabel(page, IDC_LABEL_CHECKSUM, IDS_LABEL_CHECKSUM);

  for (const wchar_t* baud : {L"300", L"600", L"1200", L"2400", L"4800", L"9600", L"19200", L"38400", L"57600", L"115200"})
    BaudList.AddString(baud);
  AddTranslated(ParityList, {IDS_PARITY_NONE, IDS_PARITY_ODD, IDS_PARITY_EVEN});
  for (const wchar_t* bits : {L"7", L"8"}) DataBitsList.AddString(bits);
  for (const wchar_t* bits : {L"1", L"1.5", L"2"}) StopBitsList.AddString(bits);
  AddTranslated(FlowList, {IDS_FLOW_NONE, IDS_FLOW_XONXOFF});
  AddTranslated(CheckSumList, {IDS_CHECKSUM_NOT_SET, IDS_CHECKSUM_SET});

  BaudText = Format(L"%d", Record->BaudRate);
  DataBitsText = Format(L"%d", Record->DataBits);
  ParityText = LoadTranslatedString(Record->Parity == 1   ? IDS_PARITY_EVEN
                                    : Record->Parity == 2 ? IDS_PARITY_ODD
                                                          : IDS_PARITY_NONE);
  StopBitsText = Record->StopBits == 2 ? L"2" : Record->StopBits == 15 ? L"1.5" : L"1";
  FlowText = LoadTranslatedString(Record->Flow == 1 ? IDS_FLOW_XONXOFF : IDS_FLOW_NONE);
  CheckSumText = LoadTranslatedString(Record->CheckSum == 1 ? IDS_CHECKSUM_SET : IDS_CHECKSUM_NOT_SET);
  UpdateData(true);
  initializing_ = false;
  return result;
}


// The sheet

CStationDialog::CStationDialog(HWND parent, CStationRecord& record, bool newLevel)
    : CPropertySheet(newLevel ? IDS_CREATE_LEVEL : IDS_LEVEL_PROPERTIES, parent, 0),
      NewLevel(newLevel ? 1 : 0),
      NameOnEntry(record.Name),
      Record(&record),
      GeneralPage(NewLevel, Record),
      AdvancedPage(NewLevel, Record) {
  AddPage(&GeneralPage);
  AddPage(&AdvancedPage);
}

BOOL CStationDialog::OnInitDialog() {
  BOOL result = CPropertySheet::OnInitDialog();
  if (HWND tabs = reinterpret_cast<HWND>(SendMessageW(Handle(), PSM_GETTABCONTROL, 0, 0))) {
    const std::wstring texts[] = {LoadTranslatedString(IDS_TAB_GENERAL), LoadTranslatedString(IDS_TAB_ADVANCED)};
    for (int tab = 0; tab < 2; ++tab) {
      TCITEMW item{};
      item.mask = TCIF_TEXT;
      item.pszText = const_cast<wchar_t*>(texts[tab].c_str());
      SendMessageW(tabs, TCM_SETITEMW, static_cast<WPARAM>(tab), reinterpret_cast<LPARAM>(&item));
    }
  }
  SetWindowTextW(Handle(), LoadTranslatedString(NewLevel ? IDS_CREATE_LEVEL : IDS_LEVEL_PROPERTIES).c_str());
  return result;
}

BOOL CStationDialog::OnCommand(WPARAM wParam, LPARAM lParam) {
  if (wParam != IDOK && wParam != kApplyCommand) return CPropertySheet::OnCommand(wParam, lParam);
  // A page the user never opened has no window: the record keeps its values for it.
  if (IsWindow(GeneralPage.Handle())) GeneralPage.UpdateData(false);
  if (IsWindow(AdvancedPage.Handle())) AdvancedPage.UpdateData(false);
  if (!ValidateStation(*Record)) return TRUE;
  SaveStation();
  return CPropertySheet::OnCommand(wParam, lParam);
}

void CStationDialog::ShowError(const std::wstring& text) {
  MessageBoxW(Handle(), text.c_str(), LoadTranslatedString(IDS_ADD_NEW_LEVEL).c_str(), MB_OK | MB_ICONERROR);
}

int CStationDialog::ValidateStation(CStationRecord& record) {
  if (record.Name.empty()) {
    ShowError(LoadTranslatedString(IDS_NAME_EMPTY));
    return 0;
  }
  // The message lists three of the four characters; the double quote is refused all the same.
  if (record.Name.find_first_of(L"\\/\"*") != std::wstring::npos) {
    ShowError(LoadTranslatedString(IDS_NAME_BAD_CHARS));
    return 0;
  }
  // A rename may not make two levels of one name either: a find would reach only one of them.
  if (NewLevel || record.Name != NameOnEntry) {
    CStationRecord existing;
    existing.Name = record.Name;
    if (FindStation(existing) == S_OK) {
      ShowError(DuplicateText(record.Name));
      return 0;
    }
  }
  return 1;
}

HRESULT CStationDialog::SaveStation() {
  if (NewLevel) {
    HRESULT result = AddStation(*Record);
    GeneralPage.LevelAdded = 1;
    return result;
  }
  HRESULT result = UpdateStation(NameOnEntry, *Record);
  // After an Apply that renamed, later saves look for the level under its new name.
  if (result == S_OK) NameOnEntry = Record->Name;
  return result;
}
