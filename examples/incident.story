# The storage daemon takes the host's free memory and is started anew.
step  60
time  cache      leak  build  balloon  swapped  unshared
10:02 0          0     0      0        0        0
10:03 51183616   0     0      0        0        0
10:04 101515264  0     0      0        0        0
10:05 148076228  0     0      2977956  7927236  0
10:06 0          0     0      880804   7402948  0
