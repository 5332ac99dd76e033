# Makes what docs/results.md reads beside the runs of the tutorial: several scenarios, with names that a reader of tables
# could misread, a screening, Sobol' indices, GLUE, and an analysis of which some evaluations fail.
scenario() { printf '[SCENARIO_%s]\nName = "%s"\nParameters = %s\n[/SCENARIO_%s]\n' "$1" "$2" "$3" "$1"; }
runs="[SCENARIO_RUNS]
TqSEKdxListItemCount = 3
$(scenario 1 'a # b' '5.0, 0.3')
$(scenario 2 'c' '9.0, 0.45')
$(scenario 3 'd' '20.0, 0.5')
[/SCENARIO_RUNS]"
awk -v runs="$runs" '
  /Scenario_Type/ { print "Scenario_Type = 1"; print runs; next }
  { sub(/\047RMSE of the flow\047/, "\047flow \"low\" # 1\047"); print }' reservoir.kdx >scenarios.kdx
Mirevo scenarios.kdx || exit 1
sed "s/Sensitivity_Type .*/Sensitivity_Type = 'Morris'/" sensitivity.kdx >morris.kdx
Mirevo morris.kdx || exit 1
sed "s/Sensitivity_Type .*/Sensitivity_Type = 'Sobol'\n[SOBOL]\nSample_Size = 32\n[\/SOBOL]/" sensitivity.kdx >sobol.kdx
Mirevo sobol.kdx || exit 1
sed "s/Uncertainty_Type .*/Uncertainty_Type = 'GLUE'\n[GLUE]\nBehavioural_Share = 0.5\n[\/GLUE]/" uncertainty.kdx >glue.kdx
Mirevo glue.kdx || exit 1
cp -R model fails
sed -i "s/^awk/awk '\$1 == \"loss\" \&\& \$3 > 0.4535 { print \"too dry # again\"; exit 3 }' parameters.txt\nawk/" fails/run.sh
sed "s,'model/,'fails/," uncertainty.kdx >failing.kdx
Mirevo failing.kdx || exit 1
