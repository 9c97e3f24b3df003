module \$paramod\serv_mem_if\WITH_CSR=1'1\W=s32'00000000000000000000000000000001 (i_clk, i_bytecnt, i_lsb, o_misalign, i_signed, i_word, i_half, i_mdu_op, i_bufreg2_q, o_rd, o_wb_sel);
  wire dat_valid;
  input i_bufreg2_q;
  wire i_bufreg2_q;
  input [1:0] i_bytecnt;
  wire [1:0] i_bytecnt;
  input i_clk;
  wire i_clk;
  input i_half;
  wire i_half;
  input [1:0] i_lsb;
  wire [1:0] i_lsb;
  input i_mdu_op;
  wire i_mdu_op;
  wire [1:0] i_mdu_op_SB_LUT4_I3_O;
  input i_signed;
  wire i_signed;
  input i_word;
  wire i_word;
  output o_misalign;
  wire o_misalign;
  output o_rd;
  wire o_rd;
  wire [3:0] o_rd_SB_LUT4_O_I0;
  output [3:0] o_wb_sel;
  wire [3:0] o_wb_sel;
  wire signbit;
  SB_LUT4 #(
    .LUT_INIT(16'hf0ff)
  ) dat_valid_SB_LUT4_O (
    .I0(1'h0),
    .I1(1'h0),
    .I2(i_word),
    .I3(i_mdu_op_SB_LUT4_I3_O[1]),
    .O(dat_valid)
  );
  SB_LUT4 #(
    .LUT_INIT(16'h00f4)
  ) i_mdu_op_SB_LUT4_I3 (
    .I0(i_half),
    .I1(i_bytecnt[0]),
    .I2(i_bytecnt[1]),
    .I3(i_mdu_op),
    .O(i_mdu_op_SB_LUT4_I3_O[1])
  );
  SB_LUT4 #(
    .LUT_INIT(16'hf000)
  ) i_signed_SB_LUT4_I2 (
    .I0(1'h0),
    .I1(1'h0),
    .I2(i_signed),
    .I3(signbit),
    .O(o_rd_SB_LUT4_O_I0[0])
  );
  SB_LUT4 #(
    .LUT_INIT(16'hfac0)
  ) o_misalign_SB_LUT4_O (
    .I0(i_half),
    .I1(i_lsb[1]),
    .I2(i_word),
    .I3(i_lsb[0]),
    .O(o_misalign)
  );
  SB_LUT4 #(
    .LUT_INIT(16'hcacc)
  ) o_rd_SB_LUT4_O (
    .I0(o_rd_SB_LUT4_O_I0[0]),
    .I1(i_bufreg2_q),
    .I2(i_word),
    .I3(i_mdu_op_SB_LUT4_I3_O[1]),
    .O(o_rd)
  );
  SB_LUT4 #(
    .LUT_INIT(16'hff0e)
  ) o_wb_sel_SB_LUT4_O (
    .I0(i_lsb[0]),
    .I1(i_half),
    .I2(i_lsb[1]),
    .I3(i_word),
    .O(o_wb_sel[1])
  );
  SB_LUT4 #(
    .LUT_INIT(16'hff30)
  ) o_wb_sel_SB_LUT4_O_1 (
    .I0(1'h0),
    .I1(i_lsb[0]),
    .I2(i_lsb[1]),
    .I3(i_word),
    .O(o_wb_sel[2])
  );
  SB_LUT4 #(
    .LUT_INIT(16'hffe0)
  ) o_wb_sel_SB_LUT4_O_2 (
    .I0(i_lsb[0]),
    .I1(i_half),
    .I2(i_lsb[1]),
    .I3(i_word),
    .O(o_wb_sel[3])
  );
  SB_LUT4 #(
    .LUT_INIT(16'h000f)
  ) o_wb_sel_SB_LUT4_O_3 (
    .I0(1'h0),
    .I1(1'h0),
    .I2(i_lsb[1]),
    .I3(i_lsb[0]),
    .O(o_wb_sel[0])
  );
  SB_DFFE signbit_SB_DFFE_Q (
    .C(i_clk),
    .D(i_bufreg2_q),
    .E(dat_valid),
    .Q(signbit)
  );
  assign i_mdu_op_SB_LUT4_I3_O[0] = i_word;
  assign o_rd_SB_LUT4_O_I0[3:1] = { i_mdu_op_SB_LUT4_I3_O[1], i_word, i_bufreg2_q };
endmodule
