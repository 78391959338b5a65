// The level property sheet: a General and an Advanced page over one CStationRecord,
// through which a user creates a digital level or changes one. The sheet checks the
// name and writes the record to the store itself.
#pragma once
#include <windows.h>
#include <initializer_list>
#include <string>
#include <vector>

#include "base/property_sheet.h"
#include "store/station_record.h"

// Appends the machine's serial port names (the data of HKLM\HARDWARE\DEVICEMAP\SERIALCOMM)
// and gives their number. The first value that is not REG_SZ, or too long, ends the list.
int EnumSerialPorts(std::vector<std::wstring>& ports);

// The port number in a port name: the digits from the first digit on (COM12 gives 12,
// A2COM7 gives 2); 0 for a name without digits.
int PortNumberOf(const std::wstring& portText);

// What both pages share: the record they edit, and marking the page modified when the user
// changes a control of an existing level (never while the page fills its controls itself).
class CStationPage : public CPropertyPage {
 public:
  int NewLevel;
  CStationRecord* Record;  // not owned

 protected:
  struct Change {
    int control;
    UINT code;
  };
  CStationPage(UINT templateId, int newLevel, CStationRecord* record, std::initializer_list<Change> changes);

  bool initializing_ = false;

 private:
  void OnChange();
};

class CStationGeneralPage : public CStationPage {
 public:
  CStationGeneralPage(int newLevel, CStationRecord* record);

  std::wstring NameText;
  std::wstring NoteText;
  std::wstring PortText;
  std::wstring ModelText;
  CComboBox PortList;
  CComboBox ModelList;
  int LevelAdded = 0;  // set by the sheet after an add; nothing reads it

 protected:
  void DoDataExchange(bool toControls) override;
  BOOL OnInitDialog() override;
};

class CStationAdvancedPage : public CStationPage {
 public:
  CStationAdvancedPage(int newLevel, CStationRecord* record);

  std::wstring ParityText;
  std::wstring BaudText;
  std::wstring DataBitsText;
  std::wstring StopBitsText;
  std::wstring FlowText;
  std::wstring CheckSumText;
  CComboBox BaudList;
  CComboBox ParityList;
  CComboBox DataBitsList;
  CComboBox StopBitsList;
  CComboBox FlowList;
  CComboBox CheckSumList;

 protected:
  void DoDataExchange(bool toControls) override;
  BOOL OnInitDialog() override;
};

class CStationDialog : public CPropertySheet {
 public:
  // The record is the caller's and must outlive the sheet; `parent` may be null.
  CStationDialog(HWND parent, CStationRecord& record, bool newLevel);

  // Non-zero when the record may be saved; otherwise it has told the user why.
  int ValidateStation(CStationRecord& record);
  // Adds the level (new-level mode) or updates it under the name it had on entry.
  HRESULT SaveStation();

  BYTE NewLevel;
  std::wstring NameOnEntry;  // the level's stored name; an Apply that renamed moves it on
  CStationRecord* Record;    // not owned
  CStationGeneralPage GeneralPage;
  CStationAdvancedPage AdvancedPage;

 protected:
  BOOL OnCommand(WPARAM wParam, LPARAM lParam) override;
  BOOL OnInitDialog() override;

 private:
  void ShowError(const std::wstring& text);
};
