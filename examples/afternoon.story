# The storage daemon caches as much as every day. A driver's heap begins to leak; machines that
# shared most of their memory are restarted; a nightly build runs early, and mail has to give.
step  120
time  cache      leak    build    balloon  swapped  unshared
13:00 123731968  0       0        0        0        0
13:20 123731968  0       0        0        0        0
14:00 123731968  89600   0        0        0        0
14:02 123731968  94080   0        0        0        7046416
14:30 123731968  156800  0        0        0        6342000
14:56 123731968  215040  5868544  0        0        5637000
15:00 123731968  224000  7000000  0        0        5536000
15:10 123731968  246400  8388608  3355444  786432   5284000
15:40 123731968  313600  8388608  3984588  1048576  4580000
15:44 123731968  322560  0        3984588  1048576  4486000
16:10 123731968  380800  0        0        209716   3875000
16:26 123731968  416640  0        0        0        3522000
17:00 123731968  416640  0        0        0        2818000
