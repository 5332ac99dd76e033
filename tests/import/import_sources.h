#pragma once

#include <string>

#include "temporary_folder.h"

namespace mirevo::testing {

/// A calibration with PEST: parameters k1 (log), k2, k3 = 2 k2 (tied), k4 fixed, k5 with scale and offset.
inline constexpr const char* kPestCase = R"(pcf
* control data
restart estimation
5 4 1 1 3
1 1 single point 1 0 0
10.0 -3.0 0.3 0.03 10
10.0 10.0 0.001
0.1
10 0.005 4 4 0.005 4
1 1 1
* singular value decomposition
1
4 5e-7
0
* parameter groups
k relative 0.02 0.0 always_3 2.0 parabolic
* parameter data
K1 log factor 1.0 0.01 100 k 1.0 0.0 1
k2 none factor 2.0 0.0 10.0 k 1.0 0.0 1
k3 tied factor 4.0 0.0 3.0 k 1.0 0.0 1
k4 fixed factor 7.0 0.0 10.0 k 1.0 0.0 1
k5 none factor 1.0 0.0 2.0 k 10.0 5.0 1
k3 k2
* observation groups
head
less_flow
regul_1
* observation data
h1 3.0 1.0 head
h2 12.0 2.0 head
h3 20.0 0.5 less_flow
h4 99.0 0.0 head
* model command line
sh model.sh
* model input/output
in.tpl in.dat
out.ins out.dat
* prior information
pi1 1.0 * log(k1) = 0.477 0.5 regul_1
++n_iter_super(3) overdue_giveup_minutes(2)
++rand_seed(11)
)";

/// The files beside that control file: the model writes k1, k2 + k3, k5 and k4.
inline void writePestModel(const TemporaryFolder& folder, const std::string& at) {
  folder.write(at + "/in.tpl", "ptf #\n# k1        #\n#k2         #\n#    K3     #\n#k4         #\n#k5         #\n");
  folder.write(at + "/out.ins", "pif ~\n~heads~\nl1 !h1! !h2!\nl1 [h3]1:12 !h4!\n");
  folder.write(at + "/model.sh",
               "set -- $(cat in.dat)\nawk -v a=$1 -v b=$2 -v c=$3 -v d=$4 -v e=$5 'BEGIN { print \"the heads\"; "
               "printf \"%.12g %.12g\\n%12.6f %g\\n\", a, b + c, e, d }' > out.dat\n");
}

/// A calibration with Ostrich, of which the model writes the same in another form.
inline constexpr const char* kOstrichCase = R"(# a calibration
ProgramType  DDS
ModelExecutable  "./model.sh"
ModelSubdir .
PreserveBestModel save.sh
RandomSeed 77
NumDigitsOfPrecision 8

BeginFilePairs
in.tpl ; in.dat
EndFilePairs

BeginParams
# name init low high tx_in tx_ost tx_out
p_a   1.0   0.01 100 none log10 none
p_b   2     0 10 none none none free
p_c   0  -1 1 log10 none none
EndParams
BeginIntegerParams
p_n 2 1 5
EndIntegerParams
BeginTiedParams
p_t 1 p_b linear 2.0 1.0 free
EndTiedParams

BeginObservations
o1  3.0  1.0  out.dat ; OST_NULL 1 1 ' ' no gA
o2  12.0 2.0  out.dat;OST_NULL 1 2 ' ' yes gA
o3  2 1.0  out.dat ; n 0 3 ' ' no gB
o4  7 0.0  out.dat ; "the second" 1 2 ',' no gB
EndObservations
BeginConstraints
c1 general 1E6 0 10 o1
EndConstraints
BeginDDSAlg
PerturbationValue 0.25
MaxIterations 60
UseInitialParamValues
Funny 3
EndDDSAlg
)";

inline void writeOstrichModel(const TemporaryFolder& folder, const std::string& at) {
  folder.write(at + "/in.tpl", "a p_a\nb p_b\nc p_c\nn p_n\nt p_t\n");
  folder.write(at + "/model.sh",
               "#!/bin/sh\nset -- $(cut -d ' ' -f 2- in.dat)\nawk -v a=$1 -v b=$2 -v c=$3 -v n=$4 -v t=$5 'BEGIN { "
               "print \"the heads\"; print a, b + t; print \"n = \" n; print \"the second\"; print c \",\" c * 7 }' "
               "> out.dat\n",
               0755);
}

}  // namespace mirevo::testing
