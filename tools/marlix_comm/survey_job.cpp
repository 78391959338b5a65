#include "survey_job.h"

#include "stand_in_files.h"

#include <windows.h>
#include <cstdarg>
#include <cstdio>
#include <utility>

namespace standin {

namespace {
// Deterministic readings, so that two downloads of the same size give the same bytes.
struct Readings {
  unsigned state = 20261121u;
  int Next(int range) {
    state = state * 1103515245u + 12345u;
    return static_cast<int>((state >> 8) % static_cast<unsigned>(range));
  }
};

}  // namespace

std::string MakeSurveyJob(size_t size) {
  SYSTEMTIME now{};
  GetLocalTime(&now);
  std::string job;
  job += "JOB,LEVEL LINE BM1-BM2\r\n";
  job += Format("DATE,%04u-%02u-%02u,%02u:%02u:%02u\r\n", now.wYear, now.wMonth, now.wDay,
              now.wHour, now.wMinute, now.wSecond);
  job += "INSTRUMENT,HRA20,SN 104532\r\n";
  job += "UNITS,METRE\r\n";
  job += "METHOD,BF\r\n";
  job += "PT,TYPE,BACKSIGHT,FORESIGHT,DISTANCE,HEIGHT\r\n";

  Readings readings;
  long height = 1000000;  // tenths of a millimetre: 100.0000 m
  job += Format("BM1,BM,,,,%ld.%04ld\r\n", height / 10000, height % 10000);
  const size_t target = size > 0 ? size : 2000;
  for (int point = 1; job.size() < target; ++point) {
    int back = 8000 + readings.Next(12000);
    int fore = 8000 + readings.Next(12000);
    int backDistance = 1500 + readings.Next(2000);
    int foreDistance = 1500 + readings.Next(2000);
    if (height < 200000 && fore > back) std::swap(back, fore);  // stay above ground
    height += back - fore;
    job += Format("TP%d,BS,%d.%04d,,%d.%02d,\r\n", point, back / 10000, back % 10000,
                backDistance / 100, backDistance % 100);
    job += Format("TP%d,FS,,%d.%04d,%d.%02d,%ld.%04ld\r\n", point, fore / 10000, fore % 10000,
                foreDistance / 100, foreDistance % 100, height / 10000, height % 10000);
  }
  job += "END\r\n";
  if (size > 0) job.resize(size, ' ');
  return job;
}

}  // namespace standin
