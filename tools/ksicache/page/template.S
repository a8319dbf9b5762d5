// The page's template, which the build makes of web/.
    .section .rodata
    .global ksicache_page_begin
    .global ksicache_page_end
ksicache_page_begin:
    .incbin KSICACHE_PAGE_TEMPLATE
ksicache_page_end:
    .byte 0
    .section .note.GNU-stack,"",%progbits
