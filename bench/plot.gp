# plot.gp FOLDER SVG: draws the report's plot from the data that report.py wrote to the folder.
folder = ARG1
set terminal svg size 1100,1150 font "sans-serif,13" background "white" name "benchmark"
set output ARG2
set multiplot
set style line 1 lc rgb "#1b6ca8"
set style line 2 lc rgb "#9a9a9a"
set style line 3 lc rgb "#d9d9d9"
set style line 4 lc rgb "#e08e2b"
set style line 5 lc rgb "#5a9e54"
set style line 6 lc rgb "#a4508b"
set grid ytics lc rgb "#dddddd"
set tics nomirror
set border 3

# The histogram: a bar for each column of the report's table.
set origin 0,0.56
set size 1,0.44
set title "Time of a call, as a ratio to the generated classes used directly"
set style data histograms
set style histogram clustered gap 1.2
set style fill solid
set boxwidth 0.95
set logscale y
set yrange [0.1:20]
set ytics (0.1, 0.2, 0.5, 1, 2, 5, 10, 20)
set key outside top center horizontal
array names[6] = ["this library", "generated classes", "by hand", "Protocol Buffers 3.21", "protobuf-c", "nanopb"]
set xtics scale 0
plot for [i = 1:6] folder."/cases.txt" using (column(i + 1)):xtic(1) linestyle i title names[i]

# The plots of growth: both axes are logarithmic, so that proportional growth is a line of slope 1.
array calls[4] = ["chat_request", "chat_reply", "message_page", "chatroom_entry"]
array titles[4] = ["chat request", "chat reply", "page of messages", "room"]
set style data linespoints
set logscale xy
set xtics scale 1 autofreq
set ytics autofreq
set yrange [*:*]
set xrange [0.8:60000]
set grid xtics ytics
set format "10^{%T}"
set xlabel "bytes of text (chat request), entries (others)"
set key inside top left vertical

set origin 0,0
set size 0.52,0.54
set title "Time of a call in ns (dashed: generated classes)"
plot for [i = 1:4] folder."/".calls[i].".txt" using 1:2 lw 2 pt 7 ps 0.5 lc i title titles[i], \
  for [i = 1:4] folder."/".calls[i].".txt" using 1:3 with lines dt 2 lc i notitle

set origin 0.5,0
set size 0.5,0.54
set title "Blocks that a call allocates"
plot for [i = 1:4] folder."/".calls[i].".txt" using 1:4 lw 2 pt 7 ps 0.5 lc i title titles[i]
unset multiplot
