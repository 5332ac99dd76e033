# What the lines of docs/results.md must have read. Runs behind them.
def lines_of(name):
    return [line.rstrip("\n").split("\t") for line in open(name) if not line.startswith("#")]


assert evaluations.shape == (301, 7) and list(evaluations.Evaluation) == list(range(1, 302))
assert perturbed.shape == (3, 7) and sample.shape == (100, 7) and len(runs) == 3
assert list(runs.columns)[-3:] == ["flow 'low' _ 1", "flow", "Aggregate"], list(runs.columns)
for table in (evaluations, perturbed, sample):
    assert (table.Status == "OK").all() and (table.dtypes.drop(["Evaluation", "Status"]) == float).all()
exact = pandas.read_csv("calibration_Optimisation.dat", sep="\t", comment="#", float_precision="round_trip")
rows = lines_of("calibration_Optimisation.dat")
for i, name in enumerate(rows[0][2:]):
    assert [float(row[2 + i]) for row in rows[1:]] == list(exact[name]), name
assert best.Evaluation == int(account["bestEvaluation"]) and best.Aggregate == float(account["bestAggregate"])

assert len(series) == 730 and str(series.Time.dtype) == "datetime64[ns]" and (series.dtypes[2:] == float).all()
assert abs(((flow.Best - flow.Observed) ** 2).mean() ** 0.5 - best.Aggregate) < 1e-5
assert list(scenarios.Evaluation.unique()) == [1, 2, 3] and scenarios.Simulated.dtype == float
assert scenarios.Measure.unique() == ["flow 'low' _ 1"], scenarios.Measure.unique()
assert str(scenarios.Time.dtype) == "datetime64[ns]"
assert list(band.columns) == ["observed", "5 %", "50 %", "95 %"] and len(band) == 730
assert str(band.index.dtype) == "datetime64[ns]" and (band["5 %"] <= band["95 %"]).all()

assert set(sensitivity.Kind) == {"measure", "objective", "observations"} and sensitivity.Composite.dtype == float
assert set(screening.Parameter) == {"delay", "loss"} and (screening.MuStarLower <= screening.MuStarUpper).all()
assert screening.MuStar.dtype == float and (screening.Certainty <= 1).all() and list(screening.Effects) == [30] * 4
assert len(indices) == 2 * (3 * 2 + 2) and (indices.Lower <= indices.Upper).all() and set(indices.Blocks) == {32}
assert set(convergence.Rows) == {32} and convergence.Index.dtype == float
assert len(over_time) == 730 and (over_time["ST delay"] <= over_time["ST delay upper"]).sum() > 600
assert abs(weights.Weight.sum() - 1) < 1e-12 and set(weights.Behavioural) == {0, 1} and weights.delay.dtype == float
for matrix in (covariance, correlation, drawn):
    assert list(matrix.index) == list(matrix.columns) == ["delay", "loss"] and (matrix.dtypes == float).all()
assert abs(covariance.loc["delay", "loss"] - covariance.loc["loss", "delay"]) < 1e-15
assert list(limits.Parameter) == ["delay", "loss"] and (limits.Lower95 < limits.Upper95).all()
assert len(jacobian) == 730 and (jacobian[["delay", "loss"]].dtypes == float).all()
assert {"parameter", "measure", "objective"} <= set(quantiles.Kind) and (quantiles["5 %"] <= quantiles["95 %"]).all()
assert account["task"] == "optimisation" and account["state"] == "finished"

failed = pandas.read_csv("failing.dat", sep="\t", comment="#").query("Status == 'FAILED'")
assert len(failed) > 0 and list(failures.Evaluation) == list(failed.Evaluation) and (failed.Aggregate == 1e30).all()
assert set(failures.Kind) == {"exitCode"} and failures.Output[0] == "too dry \\x23 again\\n", failures.Output[0]
assert pairs.Pairs[0] == 730 and len(pairs.columns) == 19
assert len(checksums) == 301 and checksums.Checksum.str.fullmatch("[0-9a-f]{16}").all()
assert report["best"]["number"] == best.Evaluation and len(report["series"]) == 1
