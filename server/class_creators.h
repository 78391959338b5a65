// The creators behind the eight class objects of the object map. Each class's own
// source defines its creator.
#pragma once
#include <windows.h>

HRESULT CreateMarlixDLShellFolder(REFIID riid, void** ppv);
HRESULT CreateMarlixDLShellView(REFIID riid, void** ppv);
HRESULT CreateMarlixDLEnumIDList(REFIID riid, void** ppv);
HRESULT CreateMarlixDLExtractIcon(REFIID riid, void** ppv);
HRESULT CreateMarlixDLDataObject(REFIID riid, void** ppv);
HRESULT CreateMarlixDLQueryInfo(REFIID riid, void** ppv);
HRESULT CreateMarlixDLDropTarget(REFIID riid, void** ppv);
HRESULT CreateMarlixDLDropTargetOnListView(REFIID riid, void** ppv);
