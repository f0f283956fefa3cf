# Turns the links of a page into links of the manual: headers to their pages, files that lie beside them, and none to
# what the manual does not have.
s#\]\((\.\./)?include/(zanbase/[^)]*\.h)\)#](@ref \2)#g
s#\]\((docs/)?(snapshot\.schema\.json|benchmarks\.svg)\)#](\2)#g
s#\[([^]]*)\]\((\.\./)?(examples|scripts|tests|src)[^)]*\)#\1#g
