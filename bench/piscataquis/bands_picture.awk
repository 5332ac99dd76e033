# Draws a year of the 90 % bands as SVG: the total one and that of the parameters alone, with the observed discharge, on
# a logarithmic axis. Files: discharge.csv, dream_TotalBand_1.csv, dream_Band_1.csv; -v year=1998.
function x(day) { return left + (day - 1) / 364 * width }
function y(value) { return top + height * (log(most) - log(value < least ? least : value)) / (log(most) - log(least)) }
function point(day, value) { return sprintf("%.1f,%.1f ", x(day), y(value)) }
BEGIN {
  FS = ","
  left = 46; top = 12; width = 840; height = 300; least = 0.3; most = 1000
}
FNR == 1 { ++file; day = 0 }
substr($1, 1, 4) != year { next }
++day > 365 { next }
file == 1 { observed = observed point(day, $2); next }
{ upper[file] = upper[file] point(day, $5); lower[file] = point(day, $3) lower[file] }
END {
  printf "<svg xmlns=\"http://www.w3.org/2000/svg\" viewBox=\"0 0 900 350\" font-family=\"sans-serif\" font-size=\"12\">\n"
  print "<title>90 % bands and observed discharge in " year "</title>"
  print "<rect width=\"900\" height=\"350\" fill=\"white\"/>"
  for (value = 1; value <= most; value *= 10) {
    printf "<path d=\"M%d %.1fH%d\" stroke=\"#ddd\"/>", left, y(value), left + width
    printf "<text x=\"%d\" y=\"%.1f\" text-anchor=\"end\" fill=\"#444\">%d</text>\n", left - 6, y(value) + 4, value
  }
  printf "<text x=\"12\" y=\"%d\" fill=\"#444\" transform=\"rotate(-90 12 %d)\" text-anchor=\"middle\">discharge, m³/s</text>\n", top + height / 2, top + height / 2
  split("Jan Feb Mar Apr May Jun Jul Aug Sep Oct Nov Dec", months, " ")
  split("1 32 60 91 121 152 182 213 244 274 305 335", first, " ")
  for (k = 1; k <= 12; ++k) {
    printf "<path d=\"M%.1f %dv5\" stroke=\"#888\"/>", x(first[k]), top + height
    printf "<text x=\"%.1f\" y=\"%d\" fill=\"#444\">%s</text>\n", x(first[k]) + 4, top + height + 18, months[k]
  }
  printf "<polygon points=\"%s%s\" fill=\"#b9d3ea\"/>\n", upper[2], lower[2]
  printf "<polygon points=\"%s%s\" fill=\"#2f6fa8\"/>\n", upper[3], lower[3]
  printf "<polyline points=\"%s\" fill=\"none\" stroke=\"#c2410c\" stroke-width=\"1.3\"/>\n", observed
  split("90 % band, total|90 % band, parameters alone|observed, " year, names, "|")
  split("#b9d3ea|#2f6fa8|#c2410c", colours, "|"); split("370 530 770", places, " ")
  for (k = 1; k <= 3; ++k) {
    printf "<rect x=\"%d\" y=\"16\" width=\"14\" height=\"9\" fill=\"%s\"/>", places[k], colours[k]
    printf "<text x=\"%d\" y=\"25\" fill=\"#222\">%s</text>\n", places[k] + 19, names[k]
  }
  print "</svg>"
}
