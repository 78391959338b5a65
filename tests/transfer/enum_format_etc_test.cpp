#include <gtest/gtest.h>

#include "server/com_base.h"
#include "transfer/enum_format_etc.h"

namespace {

const FORMATETC kFormats[4] = {
    {1, nullptr, DVASPECT_CONTENT, -1, TYMED_ISTREAM},
    {2, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
    {3, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
    {4, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
};

TEST(EnumFormatEtc, NextSkipResetCloneFollowTheirTable) {
  long locks = com::ModuleLockCount();
  {
    CEnumFormatEtc* e = CEnumFormatEtc::Create(kFormats, 4);
    ASSERT_NE(e, nullptr);

    FORMATETC out[10]{};
    ULONG fetched = 0;
    EXPECT_EQ(e->Next(10, out, &fetched), S_OK) << "fewer than asked is still S_OK";
    EXPECT_EQ(fetched, 4u);
    for (int i = 0; i < 4; ++i) EXPECT_EQ(out[i].cfFormat, kFormats[i].cfFormat);
    EXPECT_EQ(e->Next(1, out, &fetched), S_FALSE) << "at the end";

    EXPECT_EQ(e->Reset(), S_OK);
    EXPECT_EQ(e->Next(2, out, nullptr), E_POINTER);
    EXPECT_EQ(e->Next(1, nullptr, nullptr), S_FALSE);
    EXPECT_EQ(e->Next(1, out, nullptr), S_OK);
    EXPECT_EQ(out[0].cfFormat, 1);

    // Skip to exactly the end is refused and the position stays.
    EXPECT_EQ(e->Skip(3), S_FALSE);
    EXPECT_EQ(e->Skip(0xFFFFFFFFu), S_FALSE);
    EXPECT_EQ(e->Skip(2), S_OK);

    IEnumFORMATETC* clone = nullptr;
    EXPECT_EQ(e->Clone(&clone), S_OK);
    ASSERT_NE(clone, nullptr);
    EXPECT_EQ(clone->Next(1, out, nullptr), S_OK);
    EXPECT_EQ(out[0].cfFormat, 4) << "the clone starts at the same place";
    EXPECT_EQ(clone->Next(1, out, nullptr), S_FALSE);
    EXPECT_EQ(e->Next(1, out, &fetched), S_OK);
    EXPECT_EQ(out[0].cfFormat, 4) << "and moves on its own";
    EXPECT_EQ(clone->Release(), 0u);

    EXPECT_EQ(e->QueryInterface(IID_IEnumFORMATETC, nullptr), E_POINTER);
    void* p = nullptr;
    EXPECT_EQ(e->QueryInterface(IID_IUnknown, &p), S_OK);
    EXPECT_EQ(p, static_cast<IEnumFORMATETC*>(e));
    EXPECT_EQ(e->Release(), 1u);
    EXPECT_EQ(e->QueryInterface(IID_IDataObject, &p), E_NOINTERFACE);
    EXPECT_EQ(e->Release(), 0u);
  }
  EXPECT_EQ(com::ModuleLockCount(), locks);
}

TEST(EnumFormatEtc, WithoutEntriesAnswersFalse) {
  CEnumFormatEtc* e = CEnumFormatEtc::Create(nullptr, 0);
  ASSERT_NE(e, nullptr);
  FORMATETC out{};
  ULONG fetched = 7;
  EXPECT_EQ(e->Next(1, &out, &fetched), S_FALSE);
  EXPECT_EQ(e->Skip(0), S_FALSE);
  EXPECT_EQ(e->Release(), 0u);
}

}  // namespace
