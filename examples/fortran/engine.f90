! A model engine in Fortran writing its result file through the `tova`
! module: a header with one item on a 2-D grid and an equidistant calendar
! axis, the bed level as a static item, then the field of every time step as
! the engine computes it. Arrays go to the library as they are (no copies),
! texts as ordinary Fortran strings.
!
!   engine_fortran [file]      (default engine.grd)
program engine
  use tova
  implicit none
  integer, parameter :: nx = 50, ny = 40, steps = 12
  real(c_double), parameter :: dt = 600.0d0
  real(c_float) :: eta(nx, ny), bed(nx, ny)
  type(c_ptr) :: header, file, bedItem
  integer(c_int32_t) :: level, metre
  character(len=256) :: path
  integer :: i, j, t

  path = "engine.grd"
  if (command_argument_count() > 0) call get_command_argument(1, path)

  ! Keys of the unit library, by their texts.
  if (.not. qtyGetItemTypeTag("WaterLevel", level)) error stop "unknown quantity"
  if (.not. qtyGetUnitTag("m", metre)) error stop "unknown unit"

  call check(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "Lagoon", "engine_fortran example", 1, 1, &
                             F_ITEM_STATS_GLOBAL, header), "header")
  call check(grdSetItemInfo(header, grdItemD(header, 1), level, "Water level", metre, RCF_FLOAT), "item")
  call check(grdSetItemAxisEqD2(grdItemD(header, 1), metre, nx, ny, 0.0, 0.0, 25.0, 25.0), "grid")
  call check(grdSetEqCalendarAxis(header, "2025-01-15", "06:00:00", QTY_UNIT_SECOND, 0.0d0, dt, 0), "time axis")
  call check(grdFileCreate(trim(path), header, file), "create")

  ! The bed level, written once before the first time step.
  do j = 1, ny
    do i = 1, nx
      bed(i, j) = -1.0 - 0.05 * real(i + j)
    end do
  end do
  call check(grdStaticCreate(bedItem), "static item")
  call check(grdStaticSetHeader(header, bedItem), "static item header")
  call check(grdSetItemInfo(header, bedItem, QTY_ITEM_UNDEFINED, "Bed level", metre, RCF_FLOAT), "bed level")
  call check(grdSetItemAxisEqD2(bedItem, metre, nx, ny, 0.0, 0.0, 25.0, 25.0), "bed level grid")
  call check(grdStaticWrite(bedItem, file, bed), "write bed level")
  call check(grdStaticDestroy(bedItem), "static item")

  ! The engine's time loop: compute, then hand the field over.
  do t = 0, steps - 1
    do j = 1, ny
      do i = 1, nx
        eta(i, j) = 0.5 * sin(0.2 * real(i) - 0.3 * real(t)) * cos(0.1 * real(j))
      end do
    end do
    call check(grdWriteItemTimeStep(header, file, t * dt, eta), "write time step")
  end do

  call check(grdFileClose(header, file), "close")
  call check(grdHeaderDestroy(header), "free header")
  print '(a, i0, a, i0, a, i0, a)', "engine_fortran: " // trim(path) // ": ", steps, " time steps of a ", &
    nx, " x ", ny, " field"

contains

  subroutine check(status, what)
    integer(c_int32_t), intent(in) :: status
    character(len=*), intent(in) :: what
    if (status /= F_NO_ERROR) then
      print '(a)', "engine_fortran: " // what // ": " // grdGetStatusText(status)
      error stop 1
    end if
  end subroutine
end program
