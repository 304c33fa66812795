// Points and rectangles of the image editor, in pixels. Right and bottom lie beside the last pixel.
#pragma once

namespace ie {

class CPoint {
 public:
  CPoint(int x = 0, int y = 0) : m_x(x), m_y(y) {}
  void Set(int x, int y) {
    m_x = x;
    m_y = y;
  }
  int X() const { return m_x; }
  int Y() const { return m_y; }
  void X(int x) { m_x = x; }
  void Y(int y) { m_y = y; }
  void MoveBy(int dx, int dy) { Set(m_x + dx, m_y + dy); }

 private:
  int m_x, m_y;
};

class CRect {
 public:
  CRect(int left = 0, int top = 0, int right = 0, int bottom = 0)
      : m_topleft(left, top), m_bottomright(right, bottom) {}

  int Left() const { return m_topleft.X(); }
  int Top() const { return m_topleft.Y(); }
  int Right() const { return m_bottomright.X(); }
  int Bottom() const { return m_bottomright.Y(); }
  void Left(int left) { m_topleft.X(left); }
  void Top(int top) { m_topleft.Y(top); }
  void Right(int right) { m_bottomright.X(right); }
  void Bottom(int bottom) { m_bottomright.Y(bottom); }
  int Width() const { return Right() - Left(); }
  int Height() const { return Bottom() - Top(); }

  void SetRect(int left, int top, int right, int bottom) { *this = CRect(left, top, right, bottom); }
  // Keeps the size.
  void MoveTo(int x, int y) { MoveBy(x - Left(), y - Top()); }
  void MoveBy(int dx, int dy) { Deflate(dx, dy, dx, dy); }
  // Move the top left corner by (a, b) and the bottom right one by (c, d): the caller gives the signs.
  void Deflate(int a, int b, int c, int d) {
    m_topleft.MoveBy(a, b);
    m_bottomright.MoveBy(c, d);
  }
  // Strictly inside: a point on an edge is not.
  bool PtInRect(int x, int y) const { return Left() < x && x < Right() && Top() < y && y < Bottom(); }

 private:
  CPoint m_topleft, m_bottomright;
};

}  // namespace ie
