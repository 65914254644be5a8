# Prints the server's generation, then "PID MODE" for each of its workers.
BEGIN { RS = "<tr>" }
NR == 1 { match($0, /Parent Server MPM Generation: [0-9]+/); print substr($0, RSTART + 30, RLENGTH - 30) + 0; next }
{
    if (split($0, cells, "</td>") < 15) next
    pid = cells[2]; mode = cells[4]; gsub(/<[^>]*>|\n/, "", pid); gsub(/<[^>]*>|\n/, "", mode)
    if (pid ~ /^[0-9]+$/) print pid, mode
}
