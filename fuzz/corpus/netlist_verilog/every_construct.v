// a comment
/* a block
   comment */
(* top = 1 *)
module top(a, \b/c[3] , y, q);
  input [0:3] a;
  input \b/c[3] ;
  output [3:0] y;
  output q;
  wire [3:0] n;
  wire m, alias1, alias2;
  assign alias1 = m;
  assign alias2 = alias1;
  assign y[3] = 1'b0;
  NAND2 u1 (.A(a[0]), .B(\b/c[3] ), .Y(m));
  NAND2 u2 (a[1], alias2, n[0]);
  sub s1 (.i({ a[2], a[3] }), .o(y[1:0]));
  sub s2 (.i(n[1:0]), .o({ y[2], q }));
  DFF r (.D(m), .CK(a[0]), .Q());
  (* keep *) REG4 #(.INIT(4'hx), .NAME("reg")) r4 (.D(4'b1010), .Q({ n[3:1], \cut[0] }));
endmodule

module sub(input [1:0] i, output [1:0] o);
  INV g0 (.A(i[0]), .Y(o[0]));
  INV g1 (.A(i[1]), .Y(o[1]));
endmodule
