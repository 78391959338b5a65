#include "helpers/errors_source.h"

#include <map>

namespace kld::ft {

namespace {

// Sources may come and go on any thread.
struct SourceMap {
  SourceMap() { InitializeCriticalSection(&lock); }
  ~SourceMap() { DeleteCriticalSection(&lock); }
  CRITICAL_SECTION lock;
  std::map<std::wstring, CErrorsSourceBase*> sources;
};

SourceMap& Sources() {
  static SourceMap map;
  return map;
}

// Set up with the module, so that no source ever races the map's creation.
[[maybe_unused]] SourceMap& sourcesAtLoad = Sources();

class Locked {
 public:
  explicit Locked(SourceMap& map) : map_(map) { EnterCriticalSection(&map_.lock); }
  ~Locked() { LeaveCriticalSection(&map_.lock); }
  Locked(const Locked&) = delete;
  Locked& operator=(const Locked&) = delete;

 private:
  SourceMap& map_;
};

}  // namespace

CErrorsSourceBase::CErrorsSourceBase(std::wstring name) : name_(std::move(name)) {
  SourceMap& map = Sources();
  Locked lock(map);
  map.sources.emplace(name_, this);
}

CErrorsSourceBase::~CErrorsSourceBase() {
  SourceMap& map = Sources();
  Locked lock(map);
  auto found = map.sources.find(name_);
  if (found != map.sources.end() && found->second == this) map.sources.erase(found);
}

CErrorsSourceBase* CErrorsSourceBase::Find(const std::wstring& name) {
  SourceMap& map = Sources();
  Locked lock(map);
  auto found = map.sources.find(name);
  return found == map.sources.end() ? nullptr : found->second;
}

}  // namespace kld::ft
