# What the lines of docs/results.md must have read. Runs behind them.
stopifnot(
  dim(evaluations) == c(301, 7), evaluations$Evaluation == 1:301, dim(perturbed) == c(3, 7), dim(sample) == c(100, 7),
  nrow(runs) == 3, names(runs)[5:7] == c("flow 'low' _ 1", "flow", "Aggregate"),
  sapply(evaluations[3:7], is.numeric), evaluations$Status == "OK",
  best$Evaluation == as.integer(account$Value[account$Key == "bestEvaluation"]),
  nrow(series) == 730, !is.na(time), sapply(series[3:5], is.numeric),
  abs(sqrt(mean((series$Best - series$Observed)^2)) - best$Aggregate) < 1e-5,
  unique(scenarios$Evaluation) == 1:3, is.numeric(scenarios$Simulated),
  unique(scenarios$Measure) == "flow 'low' _ 1",
  names(band) == c("time", "observed", "5 %", "50 %", "95 %"), nrow(band) == 730, !is.na(days),
  is.numeric(sensitivity$Composite), is.numeric(as.matrix(covariance)), is.numeric(as.matrix(correlation)),
  is.numeric(as.matrix(drawn)), rownames(covariance) == c("delay", "loss"),
  screening$MuStarLower <= screening$MuStarUpper, screening$Effects == 30, is.numeric(screening$Certainty),
  limits$Lower95 < limits$Upper95, nrow(jacobian) == 730, is.numeric(jacobian$delay),
  quantiles[["5 %"]] <= quantiles[["95 %"]],
  nrow(failures) > 0, failures$Kind == "exitCode", failures$Output == "too dry \\x23 again\\n",
  pairs$Pairs[1] == 730, nrow(checksums) == 301, nchar(checksums$Checksum) == 16)
stopifnot(report$best$number == best$Evaluation)
