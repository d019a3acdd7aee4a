DESIGN "BLOCK" 007 {}
DESIGN 5 { BLOCK 6 70000 ("a b"="" "x
y"=2147483648) }
"unclosed ( DESIGN x//y //c
