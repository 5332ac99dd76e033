# Makes what docs/results.md reads beside the runs of the tutorial: several scenarios, with names that a reader of tables
# could misread, a screening, Sobol' indices, GLUE, DREAM, and an analysis of which some evaluations fail.
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
section() { printf "%s = '%s'\\\\n[%s]\\\\n%s\\\\n[/%s]" "$1" "$2" "$3" "$4" "$3"; }
sed "s,Sensitivity_Type .*,$(section Sensitivity_Type Sobol SOBOL 'Sample_Size = 32')," sensitivity.kdx >sobol.kdx
sed "s,Uncertainty_Type .*,$(section Uncertainty_Type GLUE GLUE 'Behavioural_Share = 0.3')," uncertainty.kdx >glue.kdx
sed "s,Uncertainty_Type .*,$(section Uncertainty_Type DREAM DREAM "Likelihood = 'normal'")," uncertainty.kdx >dream.kdx
for analysis in sobol glue dream; do Mirevo $analysis.kdx || exit 1; done
cp -R model fails
sed -i "s/^awk/awk '\$1 == \"loss\" \&\& \$3 > 0.4535 { print \"too dry # again\"; exit 3 }' parameters.txt\nawk/" fails/run.sh
sed "s,'model/,'fails/," uncertainty.kdx >failing.kdx
Mirevo failing.kdx || exit 1
