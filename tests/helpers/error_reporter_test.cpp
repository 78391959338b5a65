#include <gtest/gtest.h>

#include "helpers/error_reporter.h"
#include "helpers/errors_source.h"

using namespace kld::ft;

namespace {

class FixedReporter : public TErrorReporter {
 public:
  explicit FixedReporter(HRESULT code) : code_(code) {}
  std::wstring GetErrorText(HRESULT code, const wchar_t* text1, const wchar_t*,
                            const wchar_t*) const override {
    return code == code_ ? std::wstring(L"fixed:") + (text1 ? text1 : L"-") : std::wstring();
  }

 private:
  HRESULT code_;
};

}  // namespace

TEST(ErrorReporter, TwoModuleReportersComeFirstAndOthersJoinInOrder) {
  ASSERT_EQ(ErrorReporterCount(), 2u);
  EXPECT_NE(dynamic_cast<const TStdErrorReporter*>(ErrorReporterAt(0)), nullptr);
  EXPECT_NE(dynamic_cast<const TInternetErrorReporter*>(ErrorReporterAt(1)), nullptr);
  {
    FixedReporter a(0x8004ABCD), b(0x8004ABCD), c(0x8004ABCE);
    ASSERT_EQ(ErrorReporterCount(), 5u);
    EXPECT_EQ(ErrorReporterAt(2), &a);
    EXPECT_EQ(BuildErrorText(0x8004ABCD, L"x"), L"fixed:x");
    {
      FixedReporter d(0x8004ABCF), e(0), f(0);
      EXPECT_EQ(ErrorReporterCount(), 8u);
    }
    EXPECT_EQ(ErrorReporterCount(), 5u);
    EXPECT_EQ(ErrorReporterAt(4), &c) << "removal keeps the order";
    EXPECT_EQ(BuildErrorText(0x8004ABCE), L"fixed:-");
  }
  EXPECT_EQ(ErrorReporterCount(), 2u);
  EXPECT_EQ(BuildErrorText(0x8004ABCD), L"# 8004abcd");
}

TEST(ErrorReporter, FacilityFourNeverReachesTheSystemTable) {
  EXPECT_EQ(BuildErrorText(static_cast<HRESULT>(0x80040154)), L"# 80040154");
  EXPECT_EQ(BuildErrorText(static_cast<HRESULT>(0x80040111)), L"# 80040111") << "row with no text";
  EXPECT_EQ(BuildErrorText(static_cast<HRESULT>(0x00040301)), L"# 40301");
  EXPECT_EQ(TStdErrorReporter::StringIdOf(static_cast<HRESULT>(0x80040517)), 4011u);
  EXPECT_EQ(TStdErrorReporter::StringIdOf(static_cast<HRESULT>(0x8004051C)), 0u);
}

TEST(ErrorReporter, SystemMessagesLoseTheirLineEndAndTakeInserts) {
  std::wstring path = L"C:\\dir\\MarlixComm.dll";
  std::wstring missing = BuildErrorText(static_cast<HRESULT>(0x8007007E), path.c_str());
  ASSERT_FALSE(missing.empty());
  EXPECT_NE(missing[0], L'#') << "the system knows this code";
  EXPECT_NE(missing.back(), L'\n');
  EXPECT_NE(missing.back(), L'\r');

  std::wstring success = BuildErrorText(S_OK);
  ASSERT_FALSE(success.empty());
  EXPECT_NE(success[0], L'#');
  EXPECT_NE(success.back(), L'\n');

  // ERROR_BAD_EXE_FORMAT reads "%1 is not a valid ... application."
  std::wstring badImage = BuildErrorText(static_cast<HRESULT>(0x800700C1), path.c_str(), L"2nd");
  EXPECT_NE(badImage.find(path), std::wstring::npos) << badImage.size();
  std::wstring noText = BuildErrorText(static_cast<HRESULT>(0x800700C1));
  EXPECT_EQ(noText.find(L"%1"), std::wstring::npos);
}

TEST(ErrorReporter, InternetCodesNeedTheLibraryLoadedByOthers) {
  const HRESULT timeout = static_cast<HRESULT>(0x80072EE2);
  if (!GetModuleHandleW(L"wininet.dll")) {
    std::wstring text = BuildErrorText(timeout);
    EXPECT_FALSE(GetModuleHandleW(L"wininet.dll")) << "never loaded by the reporter";
    (void)text;
  }
  HMODULE wininet = LoadLibraryW(L"wininet.dll");
  ASSERT_TRUE(wininet);
  std::wstring text = BuildErrorText(timeout);
  EXPECT_FALSE(text.empty());
  EXPECT_NE(text[0], L'#');
  FreeLibrary(wininet);
}

namespace {

class NamedSource : public kld::ft::CErrorsSourceBase {
 public:
  using CErrorsSourceBase::CErrorsSourceBase;
  std::wstring GetErrorText(HRESULT) const override { return L"named"; }
};

}  // namespace

TEST(ErrorsSource, SourcesAreFoundByNameWhileTheyLive) {
  EXPECT_EQ(CErrorsSourceBase::Find(L"comm"), nullptr) << "the module defines none";
  {
    NamedSource first(L"comm");
    NamedSource second(L"comm");
    EXPECT_EQ(CErrorsSourceBase::Find(L"comm"), &first);
  }
  EXPECT_EQ(CErrorsSourceBase::Find(L"comm"), nullptr);
}
