// A chart with its title, its switches, its values as a table, and its files. Charts are drawn when they come into view,
// those of a short report also one by one while the page is idle; what is out of view is drawn again only when it comes
// back, so that a long report opens and scrolls at once.
import { BarChart, CustomChart, HeatmapChart, LineChart, ParallelChart, ScatterChart } from 'echarts/charts';
import {
  DatasetComponent, DataZoomComponent, GridComponent, LegendComponent, MarkAreaComponent, MarkLineComponent, ParallelComponent,
  ToolboxComponent, TooltipComponent, VisualMapComponent,
} from 'echarts/components';
import { init, use, type ECharts, type EChartsCoreOption } from 'echarts/core';
import { CanvasRenderer, SVGRenderer } from 'echarts/renderers';
import { make, shorten, table } from './dom';
import { csvOf, download, drawnValues, fileNameOf, wellFormed, type Values } from './figure_files';
import { count, tick } from './format';
import { kPaperLook, look, onLookChange, setPrinting, type Look } from './look';
import { spaced } from './numbers';

use([
  BarChart, CustomChart, HeatmapChart, LineChart, ParallelChart, ScatterChart,
  DatasetComponent, DataZoomComponent, GridComponent, LegendComponent, MarkAreaComponent, MarkLineComponent, ParallelComponent,
  ToolboxComponent, TooltipComponent, VisualMapComponent, CanvasRenderer, SVGRenderer,
]);

export type Option = EChartsCoreOption;

export interface Switch {
  key: string;
  label: string;
  on?: boolean; // initially
  hint?: string;
}

export interface ChartPlan {
  title: string;
  note?: string | (() => string);
  height: number;
  small?: boolean; // several side by side
  zoom?: 'x' | 'xy';
  spans?: { label: string; first: number; last: number }[]; // of the x axis, each with a button that zooms to it
  switches?: Switch[];
  /** What to draw. `is(key)`: whether that switch is on. */
  option: (look: Look, is: (key: string) => boolean, width?: number) => Option;
  fitsWidth?: boolean; // `option` is asked again when the width changes
  values?: () => Values;
  csv?: () => Values; // where it is not `values`; a chart without both draws points, and has their coordinates
  thinned?: boolean; // its file says so
  pick?: Pick;
}

/** What a reader picks in a chart: by a click, and by the left and right arrow keys while it has the focus. */
export interface Pick {
  at: (item: { seriesId?: string; dataIndex: number; value: unknown; name?: string }) => void;
  step: (by: number) => void;
  /** The series that show what is picked, with the ids that they have among those of `option`. */
  marks: (look: Look) => object[];
}

export type { Values };

/** `mark`: something else is picked; the chart stays as it is otherwise. */
export type Chart = HTMLElement & { redraw: () => void; mark: () => void };

const kRowsShown = 200;
const kPaperWidth = 680; // CSS pixels: A4 without its margins
const kDrawnUnasked = 80; // of a report with more charts, only those in view are drawn
export const kFileWidth = 960; // of a drawing as a file, whatever the width of the window
const kSmallFileWidth = 480;
const kPrintedPixels = 60e6; // of all charts together: a browser keeps them in memory until the print is done
const drawers = new Map<Element, Drawn>();
const coming = new IntersectionObserver((entries) => {
  for (const entry of entries) drawers.get(entry.target)?.see(entry.isIntersecting);
}, { rootMargin: '400px' });

// Those that have come into view are drawn over successive frames, so that scrolling goes on meanwhile.
const arrived = new Set<Drawn>();
function drawArrived(): void {
  const until = performance.now() + 10;
  for (const drawn of arrived) {
    arrived.delete(drawn);
    drawn.catchUp();
    if (performance.now() > until) break;
  }
  if (arrived.size > 0) requestAnimationFrame(drawArrived);
}

type Zoom = { type: string; start?: number; end?: number };

class Drawn {
  private chart: ECharts | null = null;
  private readonly state = new Map<string, boolean>();
  private picture: HTMLCanvasElement | null = null;
  private isInView = false;
  private isStale = false;

  constructor(private readonly plan: ChartPlan, private readonly figure: HTMLElement, private readonly canvas: HTMLElement) {
    for (const item of plan.switches ?? []) this.state.set(item.key, item.on ?? false);
    new ResizeObserver(() => this.fit()).observe(canvas);
    canvas.addEventListener('dblclick', () => this.resetZoom());
  }

  is = (key: string): boolean => this.state.get(key) ?? false;

  toggle(key: string): boolean {
    this.state.set(key, !this.is(key));
    this.refresh();
    return this.is(key);
  }

  see(isInView: boolean): void {
    this.isInView = isInView;
    if (isInView && arrived.add(this).size === 1) requestAnimationFrame(drawArrived);
  }

  catchUp(): void {
    if (!this.isInView || this.picture) return;
    if (!this.chart) this.draw();
    else if (this.isStale) this.refresh();
  }

  draw(): void {
    if (this.chart) return;
    this.chart = init(this.canvas, null, { height: this.plan.height });
    this.chart.on('click', (item) => this.plan.pick?.at(item as Parameters<Pick['at']>[0]));
    this.refresh();
  }

  redraw(): void {
    if (this.isInView) this.refresh();
    else this.isStale = true;
  }

  mark(): void {
    if (this.plan.pick) this.chart?.setOption({ series: this.plan.pick.marks(look()) });
    this.chart?.getZr().flush();
  }

  private refresh(width = this.canvas.clientWidth): void {
    if (!this.chart) return;
    this.isStale = false;
    if (this.chart.getWidth() !== width) this.chart.resize({ width });
    this.chart.setOption(this.option(look(), width), { notMerge: true });
    if (this.plan.zoom) {
      this.chart.dispatchAction({ type: 'takeGlobalCursor', key: 'dataZoomSelect', dataZoomSelectActive: true });
    }
    this.chart.getZr().flush();
    this.figure.dataset.drawn = 'true';
  }

  private option(look: Look, width: number): Option {
    const { animation = false, ...option } = this.plan.option(look, this.is, width);
    return { ...common(look), ...zooming(this.plan.zoom, option), animation, ...option };
  }

  private fit(): void {
    if (this.picture || !this.chart || this.chart.getWidth() === this.canvas.clientWidth) return;
    if (!this.isInView) this.isStale = true;
    else if (this.plan.fitsWidth) this.refresh();
    else {
      this.chart.resize({ width: this.canvas.clientWidth });
      this.chart.getZr().flush();
    }
  }

  zoomTo(first: number, last: number): void {
    this.draw();
    this.chart!.dispatchAction({ type: 'dataZoom', dataZoomIndex: 0, startValue: first, endValue: last });
  }

  resetZoom(): void {
    this.chart?.dispatchAction({ type: 'dataZoom', start: 0, end: 100 });
  }

  /** By keyboard: plus and minus zoom, the arrows move along the horizontal axis or pick the next one, Escape shows everything again. */
  takeKey(event: KeyboardEvent): void {
    const steps: Record<string, number> = { ArrowLeft: -1, ArrowRight: 1 };
    if (this.plan.pick && steps[event.key] && !event.ctrlKey && !event.metaKey && !event.altKey) {
      event.preventDefault();
      this.plan.pick.step(steps[event.key]!);
      return;
    }
    if (!this.plan.zoom) return;
    if (event.key === 'Escape') this.resetZoom();
    const { start = 0, end = 100 } = (this.chart?.getOption() as { dataZoom?: Zoom[] }).dataZoom?.[0] ?? {};
    const span = end - start;
    const kinds: Record<string, [number, number]> = { '+': [span / 2, 0], '-': [Math.min(100, span * 2), 0], ArrowLeft: [span, -span / 4], ArrowRight: [span, span / 4] };
    const [width, move] = kinds[event.key] ?? [0, 0];
    if (width === 0 || event.ctrlKey || event.metaKey || event.altKey) return;
    event.preventDefault();
    const from = Math.max(0, Math.min(100 - width, (start + end - width) / 2 + move));
    this.chart!.dispatchAction({ type: 'dataZoom', dataZoomIndex: 0, start: from, end: from + width });
  }

  /** A drawing for paper, of what is shown: as far as it is zoomed in, with the series that are switched on. */
  svg(width = this.small ? kSmallFileWidth : kFileWidth): string {
    const option = this.option(kPaperLook, width);
    const shown = this.chart?.getOption() as { dataZoom?: Zoom[]; legend?: { selected?: object }[] } | undefined;
    if (option.dataZoom) {
      option.dataZoom = (option.dataZoom as Zoom[]).map((zoom, index) =>
        ({ ...zoom, start: shown?.dataZoom?.[index]?.start ?? 0, end: shown?.dataZoom?.[index]?.end ?? 100 }))
        .filter(({ type }) => type !== 'slider');
    }
    if (option.legend && shown?.legend?.[0]?.selected) option.legend = { ...option.legend, selected: shown.legend[0].selected };
    const drawing = init(null, null, { renderer: 'svg', ssr: true, width, height: this.plan.height });
    drawing.setOption({ ...option, animation: false, backgroundColor: kPaperLook.surface });
    const text = drawing.renderToSVGString();
    drawing.dispose();
    return wellFormed(text, this.plan.title);
  }

  csv(): string {
    return csvOf(this.plan.csv ?? this.plan.values ?? (() => drawnValues(this.option(kPaperLook, kFileWidth))));
  }

  /** Puts a picture for a sheet `width` wide in the chart's place: what printing makes of a live canvas differs too much. */
  print(width: number, pixelRatio: number): void {
    const wasDrawn = this.chart !== null;
    this.draw();
    this.refresh(width);
    const drawing = this.chart!.getRenderedCanvas({ pixelRatio });
    this.picture = make('canvas', { class: 'picture', width: drawing.width, height: drawing.height, style: `width: ${width}px` });
    this.picture.getContext('2d')!.drawImage(drawing, 0, 0);
    this.canvas.replaceWith(this.picture);
    this.isStale = true;
    if (!wasDrawn) this.forget();
  }

  endPrint(): void {
    this.picture?.replaceWith(this.canvas);
    this.picture = null;
    if (this.isInView) this.see(true);
  }

  private forget(): void {
    this.chart!.dispose();
    this.chart = null;
    delete this.figure.dataset.drawn;
  }

  get small(): boolean {
    return this.plan.small ?? false;
  }

  get height(): number {
    return this.plan.height;
  }

  /** What is drawn now: for tests and for looking into a page. */
  get options(): unknown {
    return this.chart?.getOption();
  }
}

// Single quotes: the renderer of drawings writes the names into an attribute as they are.
const kFont = "system-ui, 'Segoe UI', 'DejaVu Sans', sans-serif";

function common(look: Look): Option {
  return {
    useUTC: true,
    backgroundColor: 'transparent',
    textStyle: { fontFamily: kFont, color: look.ink, fontSize: 12 },
    tooltip: tooltip(look),
  };
}

/** Base of every tooltip. Its formatters return elements or let the library write numbers, never HTML from a name. */
export function tooltip(look: Look, more: object = {}): object {
  return {
    confine: true,
    backgroundColor: look.surface,
    borderColor: look.rule,
    textStyle: { color: look.ink, fontSize: 12 },
    extraCssText: 'max-width: 340px; white-space: normal; overflow-wrap: anywhere; box-shadow: 0 2px 10px rgb(0 0 0 / 18%);',
    ...more,
  };
}

/** What a tooltip shows: a headline and lines of name and value. */
export function tip(headline: string, lines: [string, string][] = []): HTMLElement {
  return make('div', { class: 'tip' }, make('strong', {}, headline),
    ...lines.map(([name, value]) => make('div', {}, make('span', {}, name), make('b', {}, value))));
}

// Dragging selects a span to zoom to; the wheel zooms only with Ctrl, since otherwise it scrolls the page.
const inside = { type: 'inside', zoomOnMouseWheel: 'ctrl', moveOnMouseMove: false, moveOnMouseWheel: false };

/** Zoom along a time axis, with a slider below the chart. `filterMode` 'filter' lets the other axis follow what is shown. */
export function timeZoom(look: Look, xAxisIndex: number[], filterMode: 'filter' | 'none', labelFormatter: (time: number) => string): object[] {
  return [
    { ...inside, xAxisIndex, filterMode },
    { type: 'slider', xAxisIndex, filterMode, labelFormatter, height: 26, bottom: 8, left: 72, right: 16, showDataShadow: false, brushSelect: false,
      borderColor: look.rule, fillerColor: `${look.band}33`, textStyle: { color: look.muted },
      handleStyle: { color: look.surface, borderColor: look.muted }, moveHandleStyle: { color: look.muted } },
  ];
}

function zooming(zoom: ChartPlan['zoom'], option: Option): Option {
  if (!zoom) return {};
  const all = (axis: unknown) => (Array.isArray(axis) ? axis.map((_, index) => index) : [0]);
  return {
    toolbox: {
      itemSize: 0,
      left: -50,
      feature: { dataZoom: { yAxisIndex: zoom === 'x' ? 'none' : undefined, filterMode: 'none', icon: { zoom: 'none', back: 'none' } } },
    },
    dataZoom: [
      { ...inside, xAxisIndex: all(option.xAxis), filterMode: 'none' },
      ...(zoom === 'xy' ? [{ ...inside, yAxisIndex: [0], filterMode: 'none' }] : []),
    ],
  };
}

// The same style for all units; by default the library sets the larger ones in bold. The first label has the year, and a
// time of day the date, so that a short span says when it is. Where the axis begins at an odd time the date is enough.
function timeLabel(time: number, index: number): string {
  const [month, day, clock] = ['{MMM}', '{d} {MMM}', time % 60000 === 0 ? '{HH}:{mm}' : '{HH}:{mm}:{ss}'];
  const [date, rest] = [new Date(time).toISOString().slice(0, 10), time % 86400000];
  const year = index === 0 ? ' {yyyy}' : '';
  if (rest !== 0 && index === 0) return time % 900000 === 0 ? `${day}${year}, ${clock}` : day + year;
  if (rest !== 0) return clock;
  if (!date.endsWith('-01')) return day + year;
  return date.endsWith('-01-01') ? '{yyyy}' : month + year;
}

export interface AxisPlan {
  name?: string;
  log?: boolean;
  integer?: boolean; // counts and whole numbers: no ticks between them
  [key: string]: unknown;
}

/** An axis in the page's style. */
export function axis(look: Look, plan: AxisPlan): object {
  const { log, name, integer = plan.minInterval === 1, ...more } = plan;
  const type = (more.type as string | undefined) ?? (log ? 'log' : 'value');
  return {
    type,
    name,
    nameLocation: 'middle',
    nameTextStyle: { color: look.muted, width: 260, overflow: 'truncate' },
    scale: true,
    axisLine: { show: true, onZero: false, lineStyle: { color: look.muted } },
    axisTick: { show: true, lineStyle: { color: look.muted } },
    splitLine: { show: type !== 'category', lineStyle: { color: look.rule } },
    ...(integer ? { minInterval: 1 } : {}),
    ...more,
    axisLabel: {
      color: look.muted, hideOverlap: true,
      ...(type === 'value' || type === 'log' ? { formatter: (value: number) => (integer ? count(value) : tick(value)) } : {}),
      ...(type === 'time' ? { formatter: timeLabel, showMinLabel: true, alignMinLabel: 'left' } : {}),
      ...(more.axisLabel as object | undefined),
    },
  };
}

/** A name that is drawn. In isolates: the library keeps the widths of texts in an object by the texts themselves, among which `__proto__` must not be. */
export const drawnName = (name: string) => `\u2068${name}\u2069`;

export function legend(look: Look, more: object = {}): object {
  return {
    formatter: drawnName,
    top: 0, left: 'center', type: 'scroll', itemWidth: 22, itemHeight: 14,
    textStyle: { color: look.ink, width: 220, overflow: 'truncate' }, inactiveColor: look.faded,
    pageTextStyle: { color: look.muted }, pageIconColor: look.ink, pageIconInactiveColor: look.rule, ...more,
  };
}

/** Entries of a legend whose icon is the line as it is drawn, without the disc of a point. */
export function lineEntries(names: string[]): object[] {
  return names.map((name) => ({ name, itemStyle: { opacity: 0 }, lineStyle: { width: 'inherit' } }));
}

export function chart(plan: ChartPlan): Chart {
  const keys = [plan.zoom ? 'Plus and minus zoom' : '', plan.pick ? 'left and right arrow keys pick the next one' : plan.zoom ? 'arrow keys move along' : '',
    plan.zoom ? 'Escape shows everything' : ''].filter(Boolean).join(', ');
  const canvas = make('div', {
    class: 'canvas', role: 'img', style: `height: ${plan.height}px`, tabindex: keys ? 0 : null, 'aria-label': keys ? `${plan.title}. ${keys[0]!.toUpperCase()}${keys.slice(1)}.` : plan.title,
  });
  const note = make('p', { class: 'note' });
  const tools = make('div', { class: 'tools' });
  const figure = make('figure', { class: plan.small ? 'chart small' : 'chart' },
    make('header', {}, make('figcaption', { title: plan.title }, plan.title), tools), canvas, note);
  const drawn = new Drawn(plan, figure, canvas);

  const renote = () => {
    note.textContent = typeof plan.note === 'function' ? plan.note() : plan.note ?? '';
    note.hidden = note.textContent === '';
  };
  for (const item of plan.switches ?? []) {
    const button = make('button', {
      type: 'button', title: item.hint, 'aria-pressed': String(item.on ?? false),
      onclick: () => {
        button.setAttribute('aria-pressed', String(drawn.toggle(item.key)));
        renote();
      },
    }, item.label);
    tools.append(button);
  }
  for (const { label, first, last } of plan.spans ?? []) {
    tools.append(make('button', { type: 'button', title: `Zoom to ${label}`, onclick: () => drawn.zoomTo(first, last) }, shorten(label, 24)));
  }
  if (keys) canvas.addEventListener('keydown', (event) => drawn.takeKey(event));
  if (plan.zoom) {
    tools.append(make('button', {
      type: 'button', class: 'reset', onclick: () => drawn.resetZoom(),
      title: 'Drag across the chart to zoom in, or hold Ctrl and turn the wheel, or press + and \u2212 in it. A double click or Escape shows everything again.',
    }, 'Reset zoom'));
  }
  const take = (ending: string, label: string, hint: string, kind: string, content: () => string) => tools.append(make('button', {
    type: 'button', class: 'take', title: hint, 'aria-label': `${label} of \u201c${plan.title}\u201d`,
    onclick: () => download(fileNameOf(figure, plan.title, ending), kind, content()),
  }, label));
  take('.svg', 'SVG', 'Save the chart as a drawing', 'image/svg+xml', () => drawn.svg());
  take(plan.thinned ? '_thinned.csv' : '.csv', 'CSV', plan.thinned
    ? 'Save what is drawn as a table: a part of all values, which are more than a chart can show' : 'Save what is drawn as a table',
  'text/csv', () => drawn.csv());
  if (plan.values) figure.append(valuesTable(plan.title, plan.values));
  renote();
  drawers.set(figure, drawn);
  coming.observe(figure);
  return Object.assign(figure, {
    redraw: () => {
      renote();
      drawn.redraw();
    },
    mark: () => {
      renote();
      drawn.mark();
    },
  });
}

// The table is made when it is opened; most never are.
function valuesTable(title: string, values: () => Values): HTMLElement {
  const details = make('details', {}, make('summary', {}, 'Values'));
  details.addEventListener('toggle', () => {
    while (details.children.length > 1) details.lastChild!.remove();
    if (!details.open) return;
    const { columns, length, row, reason } = values();
    if (length > kRowsShown) {
      details.append(make('p', { class: 'note' }, `${kRowsShown} of ${count(length)} rows, evenly spaced.`));
    }
    const places = spaced(length, kRowsShown);
    details.append(table(columns, places.map(row), title, (place, column) => reason?.(places[place]!, column)));
  });
  return details;
}

/** Draws what is out of view little by little, if that is not too much, and everything for a print. Call once, after the page is built. */
export function drawInTime(allDrawn: () => void): void {
  const all = () => [...drawers.values()];
  const waiting = drawers.size > kDrawnUnasked ? [] : all();
  const next = () => {
    const until = performance.now() + 30;
    while (waiting.length > 0 && performance.now() < until) waiting.shift()!.draw();
    if (waiting.length > 0) setTimeout(next, 0);
    else requestAnimationFrame(() => setTimeout(untilQuiet, 0)); // by then it is known which are in view
  };
  const untilQuiet = () => (arrived.size > 0 ? requestAnimationFrame(untilQuiet) : allDrawn());
  setTimeout(next, 0);

  onLookChange(() => all().forEach((drawn) => drawn.redraw()));
  window.addEventListener('beforeprint', () => {
    setPrinting(true);
    const widthOf = (drawn: Drawn) => (drawn.small ? Math.floor(kPaperWidth / 2) - 16 : kPaperWidth);
    const pixels = all().reduce((sum, drawn) => sum + widthOf(drawn) * drawn.height, 0);
    const ratio = Math.min(2, Math.max(1, Math.sqrt(kPrintedPixels / pixels)));
    all().forEach((drawn) => drawn.print(widthOf(drawn), ratio));
  });
  window.addEventListener('afterprint', () => {
    all().forEach((drawn) => drawn.endPrint());
    setPrinting(false);
  });
}

/** For tests and for looking into a page: what the chart in `figure` draws, and its drawing at a width. */
export function drawnOptions(figure: Element): unknown {
  return drawers.get(figure)?.options;
}

export function drawingOf(figure: Element, width?: number): string | undefined {
  return drawers.get(figure)?.svg(width);
}
