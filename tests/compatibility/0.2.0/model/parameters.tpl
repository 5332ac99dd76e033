!
a = !a              !
b = !b              !
c = !c              !
