module \$paramod\serv_alu\W=s32'00000000000000000000000000000001 (clk, i_en, i_cnt0, o_cmp, i_sub, i_bool_op, i_cmp_eq, i_cmp_sig, i_rd_sel, i_rs1, i_op_b, i_buf, o_rd);
  wire _00_;
  wire _01_;
  wire _02_;
  wire _03_;
  wire _04_;
  wire _05_;
  wire _06_;
  wire _07_;
  wire _08_;
  wire _09_;
  wire _10_;
  wire _11_;
  wire _12_;
  wire _13_;
  wire _14_;
  wire _15_;
  wire _16_;
  wire _17_;
  wire _18_;
  wire _19_;
  wire _20_;
  wire _21_;
  wire add_cy_r;
  input clk;
  wire clk;
  wire cmp_r;
  input [1:0] i_bool_op;
  wire [1:0] i_bool_op;
  input i_buf;
  wire i_buf;
  input i_cmp_eq;
  wire i_cmp_eq;
  input i_cmp_sig;
  wire i_cmp_sig;
  input i_cnt0;
  wire i_cnt0;
  input i_en;
  wire i_en;
  input i_op_b;
  wire i_op_b;
  input [2:0] i_rd_sel;
  wire [2:0] i_rd_sel;
  input i_rs1;
  wire i_rs1;
  input i_sub;
  wire i_sub;
  output o_cmp;
  wire o_cmp;
  output o_rd;
  wire o_rd;
  sg13g2_nand2_1 _22_ (
    .A(add_cy_r),
    .B(i_rs1),
    .Y(_02_)
  );
  sg13g2_nor2_1 _23_ (
    .A(add_cy_r),
    .B(i_rs1),
    .Y(_03_)
  );
  sg13g2_xor2_1 _24_ (
    .A(add_cy_r),
    .B(i_rs1),
    .X(_04_)
  );
  sg13g2_xnor2_1 _25_ (
    .A(i_op_b),
    .B(i_sub),
    .Y(_05_)
  );
  sg13g2_xnor2_1 _26_ (
    .A(_04_),
    .B(_05_),
    .Y(_06_)
  );
  sg13g2_o21ai_1 _27_ (
    .A1(i_cnt0),
    .A2(cmp_r),
    .B1(i_cmp_eq),
    .Y(_07_)
  );
  sg13g2_or2_1 _28_ (
    .A(_06_),
    .B(_07_),
    .X(_08_)
  );
  sg13g2_o21ai_1 _29_ (
    .A1(_03_),
    .A2(_05_),
    .B1(_02_),
    .Y(_09_)
  );
  sg13g2_xor2_1 _30_ (
    .A(i_rs1),
    .B(i_op_b),
    .X(_10_)
  );
  sg13g2_nand2_1 _31_ (
    .A(i_cmp_sig),
    .B(_10_),
    .Y(_11_)
  );
  sg13g2_nor2_1 _32_ (
    .A(_09_),
    .B(_11_),
    .Y(_12_)
  );
  sg13g2_a21o_1 _33_ (
    .A1(_09_),
    .A2(_11_),
    .B1(i_cmp_eq),
    .X(_13_)
  );
  sg13g2_o21ai_1 _34_ (
    .A1(_12_),
    .A2(_13_),
    .B1(_08_),
    .Y(o_cmp)
  );
  sg13g2_mux2_1 _35_ (
    .A0(i_sub),
    .A1(_09_),
    .S(i_en),
    .X(_00_)
  );
  sg13g2_nand2b_1 _36_ (
    .A_N(i_bool_op[0]),
    .B(_10_),
    .Y(_14_)
  );
  sg13g2_nand3_1 _37_ (
    .A(i_rs1),
    .B(i_op_b),
    .C(i_bool_op[1]),
    .Y(_15_)
  );
  sg13g2_nand2_1 _38_ (
    .A(_14_),
    .B(_15_),
    .Y(_16_)
  );
  sg13g2_nand3_1 _39_ (
    .A(i_cnt0),
    .B(cmp_r),
    .C(i_rd_sel[1]),
    .Y(_17_)
  );
  sg13g2_a22oi_1 _40_ (
    .A1(i_rd_sel[0]),
    .A2(_06_),
    .B1(_16_),
    .B2(i_rd_sel[2]),
    .Y(_18_)
  );
  sg13g2_nand3b_1 _41_ (
    .A_N(i_buf),
    .B(_17_),
    .C(_18_),
    .Y(o_rd)
  );
  sg13g2_mux2_1 _42_ (
    .A0(cmp_r),
    .A1(o_cmp),
    .S(i_en),
    .X(_01_)
  );
  sg13g2_dfrbp_1 _43_ (
    .CLK(clk),
    .D(_00_),
    .Q(add_cy_r),
    .Q_N(_20_),
    .RESET_B(_21_)
  );
  sg13g2_dfrbp_1 _44_ (
    .CLK(clk),
    .D(_01_),
    .Q(cmp_r),
    .Q_N(_19_),
    .RESET_B(_21_)
  );
  sg13g2_tiehi _45_ (
    .L_HI(_21_)
  );
endmodule
