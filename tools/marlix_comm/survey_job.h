// A levelling job as a digital level would send it in its text format.
#pragma once
#include <string>

namespace standin {

// A plausible job: header (job, date, instrument), then a levelling line of staff
// readings, distances and reduced heights. With `size` > 0 the text is cut or
// extended to exactly that many bytes.
std::string MakeSurveyJob(size_t size);

}  // namespace standin
