// The download dialog's template as the resource holds it: the dialog opens from it and
// every label is rewritten at run time, so layout, styles and tab order are all it fixes.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "server/module_instance.h"
#include "server/resource_ids.h"

namespace {

// Reads a classic DLGTEMPLATE (not the EX form) without going past the resource's end.
class TemplateReader {
 public:
  TemplateReader(const unsigned char* data, size_t size) : data_(data), size_(size) {}
  bool ok() const { return ok_; }
  DWORD Dword() { DWORD v = 0; Take(&v, 4); return v; }
  WORD Word() { WORD v = 0; Take(&v, 2); return v; }
  short Short() { return static_cast<short>(Word()); }
  // A name: 0 none, 0xFFFF then an ordinal, or a NUL-terminated UTF-16 string.
  std::wstring Name(WORD* ordinal = nullptr) {
    WORD first = Word();
    if (first == 0xFFFF) {
      WORD value = Word();
      if (ordinal) *ordinal = value;
      return L"#" + std::to_wstring(value);
    }
    std::wstring text;
    for (WORD c = first; c != 0 && ok_; c = Word()) text.push_back(static_cast<wchar_t>(c));
    return text;
  }
  void AlignDword() { pos_ = (pos_ + 3) & ~size_t{3}; }

 private:
  void Take(void* out, size_t n) {
    if (pos_ + n > size_) { ok_ = false; return; }
    std::memcpy(out, data_ + pos_, n);
    pos_ += n;
  }
  const unsigned char* data_;
  size_t size_;
  size_t pos_ = 0;
  bool ok_ = true;
};

struct Item {
  int id;
  WORD classAtom;
  std::wstring text;
  short x, y, cx, cy;
  DWORD style;
};

TEST(DownloadDialogTemplate, LayoutStylesAndTabOrderAreAsDesigned) {
  HRSRC found = FindResourceW(ModuleInstance(), MAKEINTRESOURCEW(IDD_DOWNLOAD), RT_DIALOG);
  ASSERT_NE(found, nullptr);
  auto* data = static_cast<const unsigned char*>(LockResource(LoadResource(ModuleInstance(), found)));
  TemplateReader r(data, SizeofResource(ModuleInstance(), found));

  DWORD style = r.Dword();
  EXPECT_EQ(style & ~(WS_POPUP | WS_CAPTION | WS_SYSMENU | DS_MODALFRAME | DS_SETFONT | DS_SYSMODAL), 0u);
  EXPECT_EQ(style & (WS_POPUP | WS_CAPTION | WS_SYSMENU | DS_MODALFRAME | DS_SETFONT | DS_SYSMODAL),
            static_cast<DWORD>(WS_POPUP | WS_CAPTION | WS_SYSMENU | DS_MODALFRAME | DS_SETFONT | DS_SYSMODAL));
  r.Dword();  // extended style
  WORD count = r.Word();
  r.Short(); r.Short();
  EXPECT_EQ(r.Short(), 267);
  EXPECT_EQ(r.Short(), 178);
  EXPECT_EQ(r.Name(), L"");  // no menu
  EXPECT_EQ(r.Name(), L"");  // standard class
  EXPECT_EQ(r.Name(), L"Download file from Digital Level");
  EXPECT_EQ(r.Word(), 8);
  EXPECT_EQ(r.Name(), L"MS Sans Serif");
  ASSERT_EQ(count, 7);

  std::vector<Item> items;
  for (int i = 0; i < count; ++i) {
    r.AlignDword();
    Item item{};
    item.style = r.Dword();
    r.Dword();
    item.x = r.Short(); item.y = r.Short(); item.cx = r.Short(); item.cy = r.Short();
    item.id = r.Word();
    r.Name(&item.classAtom);
    item.text = r.Name();
    WORD extra = r.Word();
    for (WORD b = 0; b < extra; b += 2) r.Word();
    items.push_back(item);
  }
  ASSERT_TRUE(r.ok());

  constexpr WORD kButton = 0x80, kEdit = 0x81, kStatic = 0x82;
  const Item expected[] = {
      {IDCANCEL, kButton, L"Cancel", 80, 157, 50, 14, 0},
      {IDC_TRANSFER_START, kButton, L"Start", 140, 157, 50, 14, 0},
      {IDC_TRANSFER_STATUS, kStatic, L"Status text", 45, 142, 215, 10, 0},
      {IDC_TRANSFER_STATUS_LABEL, kStatic, L"Status:", 5, 142, 25, 10, 0},
      {IDC_TRANSFER_INSTRUCTIONS, kEdit, L"", 5, 5, 255, 112, 0},
      {IDC_TRANSFER_NAME_LABEL, kStatic, L"File name:", 5, 127, 35, 10, 0},
      {IDC_TRANSFER_NAME, kStatic, L"Name", 45, 127, 215, 10, 0},
  };
  for (int i = 0; i < 7; ++i) {
    SCOPED_TRACE(i);
    EXPECT_EQ(items[i].id, expected[i].id);
    EXPECT_EQ(items[i].classAtom, expected[i].classAtom);
    EXPECT_EQ(items[i].text, expected[i].text);
    EXPECT_EQ(items[i].x, expected[i].x);
    EXPECT_EQ(items[i].y, expected[i].y);
    EXPECT_EQ(items[i].cx, expected[i].cx);
    EXPECT_EQ(items[i].cy, expected[i].cy);
  }
  for (int i : {0, 1}) {
    EXPECT_TRUE(items[i].style & WS_TABSTOP);
    EXPECT_EQ(items[i].style & BS_TYPEMASK, static_cast<DWORD>(BS_PUSHBUTTON));  // no default button
  }
  const DWORD editStyle = ES_READONLY | ES_MULTILINE | ES_AUTOVSCROLL | WS_VSCROLL | WS_BORDER | WS_TABSTOP;
  EXPECT_EQ(items[4].style & editStyle, editStyle);
  EXPECT_FALSE(items[4].style & ES_WANTRETURN);
}

}  // namespace
