// VRX netlist
// top design: top
(P=1 Q)
DESIGN top (R=x) {
   BLOCK top 2 (NAME=top) {
      PIN a (TYPE=IN CONN=a)
   }
   BLOCK u1 (NAME=u1)
   SIGNAL a (GLOBAL)
}
