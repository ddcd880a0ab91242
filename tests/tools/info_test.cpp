// lumra info, of recordings and of the library. SPDX-License-Identifier: MIT
#include <lumra/lumra.hpp>

#include "tools/program.hpp"

namespace tests {
namespace {

using Info = ProgramTest;

TEST_F(Info, TellsWhatIsInARecording) {
  write("x.sigmf-data", bytes_of(noise(20)));
  write("x.sigmf-meta",
        metadata(R"(, "core:version": "1.2.0", "core:description": "two\nlines")",
                 R"({"core:frequency": 1e9, "core:datetime": "2024-05-06T07:08:09Z"}, {"core:sample_start": 10})",
                 R"({"core:sample_start": 2, "core:freq_lower_edge": -5, "core:freq_upper_edge": 7.5,
                     "core:label": "a\u001B[2J\u009B\u202E\u00B5"}, {"core:sample_start": -1})"));
  write("y.cu8", std::string(30, '\0'));
  const std::string line = "info x y.cu8 --rate 1k";
  EXPECT_EQ(
      R"({"path":"x","datatype":"cf32_le","sample_rate_hz":1000.0,"frequency_hz":null,"samples":20,"duration_s":0.02,)"
      R"("channels":1,"captures":[{"start":0,"samples":10,"frequency_hz":1000000000.0,"time":"2024-05-06T07:08:09Z"},)"
      R"({"start":10,"samples":10,"frequency_hz":null,"time":null}],"annotations":[{"start":2,"samples":null,)"
      R"("low_hz":-5.0,"high_hz":7.5,"label":"a\u001b[2J)"
      "\xC2\x9B\xE2\x80\xAE\xC2\xB5"
      R"(","comment":""}],"faults":["annotation 1: core:sample_start must be a whole number from 0 to 2^52; )"
      R"(it is left out"]})"
      "\n"
      R"({"path":"y.cu8","datatype":"cu8","sample_rate_hz":1000.0,"frequency_hz":null,"samples":15,"duration_s":0.015,)"
      R"("channels":1,"captures":[{"start":0,"samples":15,"frequency_hz":null,"time":null}],)"
      R"("annotations":[],"faults":[]})"
      "\n",
      succeed(line + " --json -").out);
  EXPECT_EQ(
      "recording,datatype,sample_rate_hz,frequency_hz,samples,duration_s,channels,captures,annotations,faults\n"
      "x,cf32_le,1000,,20,0.02,1,2,1,1\ny.cu8,cu8,1000,,15,0.015,1,1,0,0\n",
      succeed(line + " --csv -").out);
  // People are shown no control, neither those of ASCII nor others.
  const std::string shown = succeed(line).out;
  EXPECT_NE(std::string::npos, shown.find("two\\x0Alines"));
  EXPECT_NE(std::string::npos, shown.find("a\\x1B[2J\\xC2\\x9B\\xE2\\x80\\xAE\xC2\xB5"));
  write("x.sigmf-meta", metadata(R"(, "core:dataset": "\u001B[31m\u009B")"));
  refuse(1, "\\x1B[31m\\xC2\\x9B: No such file", "info x");
  write("x.sigmf-meta", R"({"global": {"core:datatype": "\u001B[31m\u009B"}})");
  refuse(1, "'\\x1B[31m\\xC2\\x9B'", "info x");
}

TEST_F(Info, NamesLibraryPathAndMkl) {
  for (const char *form : {"info", "info --json -", "info --csv -"})
    for (const std::string &part : {lumra::library().version_text, std::string(LUMRA_MKL_VERSION), std::string("AVX")})
      EXPECT_NE(std::string::npos, succeed(form).out.find(part)) << part;
}

}  // namespace
}  // namespace tests
