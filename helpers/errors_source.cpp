#include "helpers/errors_source.h"

#include <map>

namespace kld::ft {

namespace {

// Sources may come and go on any thread. The lock needs no set-up, so the map is ready
// before any source of another file's static could register.
struct SourceMap {
  SRWLOCK lock = SRWLOCK_INIT;
  std::map<std::wstring, CErrorsSourceBase*> sources;
};

SourceMap sourceMap;

SourceMap& Sources() { return sourceMap; }

class Locked {
 public:
  explicit Locked(SourceMap& map) : map_(map) { AcquireSRWLockExclusive(&map_.lock); }
  ~Locked() { ReleaseSRWLockExclusive(&map_.lock); }
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
