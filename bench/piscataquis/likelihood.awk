# The largest log-likelihood, times -1, of the daily discharge of simulated.csv given discharge.csv, 1981-10-01 to
# 1990-09-30, over all standard deviations and correlations of normal AR(1) errors of the Box-Cox transformed series
# (lambda: -v lambda=0.3). Written apart from the program, so that each can be compared with the other.
function transformed(q) { return lambda == 0 ? log(q) : (q ^ lambda - 1) / lambda }
function minus(phi) { return n / 2 * (log(2 * 3.14159265358979 * squares(phi) / n) + 1) - log(1 - phi * phi) / 2 }
function squares(phi) { return all - 2 * phi * next_ + phi * phi * inner }
{ day = substr($1, 1, 10) }
day < "1981-10-01" || day > "1990-09-30" || $1 !~ /^[0-9]/ { next }
FNR == NR { simulated[day] = $2; next }
{
  e = transformed($2) - transformed(simulated[day])
  all += e * e
  if (n > 0) { next_ += e * before; if (n > 1) inner += before * before }
  jacobian += (lambda - 1) * log($2)
  before = e
  ++n
}
END {
  # Golden section; the logarithm of the squares is flat at 1 alone.
  low = 0; high = 0.9999; ratio = (sqrt(5) - 1) / 2
  for (k = 0; k < 60; ++k) {
    a = high - ratio * (high - low); b = low + ratio * (high - low)
    if (minus(a) < minus(b)) high = b; else low = a
  }
  printf "%.9g\n", minus(low) - jacobian
}
