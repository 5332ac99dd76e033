// A chart with its title, its switches and its values as a table. Charts are drawn when they come into view, the others
// one by one while the page is idle, so that a long report opens at once.
import { BarChart, CustomChart, HeatmapChart, LineChart, ParallelChart, ScatterChart } from 'echarts/charts';
import {
  DatasetComponent, DataZoomComponent, GridComponent, LegendComponent, MarkAreaComponent, MarkLineComponent, ParallelComponent,
  ToolboxComponent, TooltipComponent, VisualMapComponent,
} from 'echarts/components';
import { init, use, type ECharts, type EChartsCoreOption } from 'echarts/core';
import { CanvasRenderer } from 'echarts/renderers';
import { make, shorten, table, type Column } from './dom';
import { count, number } from './format';
import { look, onLookChange, setPrinting, type Look } from './look';
import { spaced } from './numbers';

use([
  BarChart, CustomChart, HeatmapChart, LineChart, ParallelChart, ScatterChart,
  DatasetComponent, DataZoomComponent, GridComponent, LegendComponent, MarkAreaComponent, MarkLineComponent, ParallelComponent,
  ToolboxComponent, TooltipComponent, VisualMapComponent, CanvasRenderer,
]);

export type Option = EChartsCoreOption;

export interface Switch {
  key: string;
  label: string;
  on?: boolean; // initially
  hint?: string;
}

export interface Values {
  columns: Column[];
  length: number;
  row: (index: number) => string[];
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
  option: (look: Look, is: (key: string) => boolean) => Option;
  values?: () => Values;
}

export type Chart = HTMLElement & { redraw: () => void };

const kRowsShown = 200;
const kPaperWidth = 680; // CSS pixels: A4 without its margins
const kDrawnUnasked = 80; // the others are drawn only when they are viewed or printed
const drawers = new Map<Element, Drawn>();
const coming = new IntersectionObserver((entries) => {
  for (const entry of entries) if (entry.isIntersecting) drawers.get(entry.target)?.draw();
}, { rootMargin: '400px' });

class Drawn {
  private chart: ECharts | null = null;
  private readonly state = new Map<string, boolean>();
  private picture: HTMLCanvasElement | null = null;

  constructor(private readonly plan: ChartPlan, private readonly figure: HTMLElement, private readonly canvas: HTMLElement) {
    for (const item of plan.switches ?? []) this.state.set(item.key, item.on ?? false);
  }

  is = (key: string): boolean => this.state.get(key) ?? false;

  toggle(key: string): boolean {
    this.state.set(key, !this.is(key));
    this.redraw();
    return this.is(key);
  }

  draw(): void {
    if (this.chart) return;
    coming.unobserve(this.figure);
    this.chart = init(this.canvas, null, { height: this.plan.height });
    new ResizeObserver(() => {
      if (this.picture) return;
      this.chart!.resize();
      this.chart!.getZr().flush();
    }).observe(this.canvas);
    this.canvas.addEventListener('dblclick', () => this.resetZoom());
    this.redraw();
  }

  redraw(): void {
    if (!this.chart) return;
    const { animation = false, ...option } = this.plan.option(look(), this.is);
    this.chart.setOption({ ...common(look()), ...zooming(this.plan.zoom, option), animation, ...option }, { notMerge: true });
    if (this.plan.zoom) {
      this.chart.dispatchAction({ type: 'takeGlobalCursor', key: 'dataZoomSelect', dataZoomSelectActive: true });
    }
    this.chart.getZr().flush();
    this.figure.dataset.drawn = 'true';
  }

  zoomTo(first: number, last: number): void {
    this.draw();
    this.chart!.dispatchAction({ type: 'dataZoom', dataZoomIndex: 0, startValue: first, endValue: last });
  }

  resetZoom(): void {
    this.chart?.dispatchAction({ type: 'dataZoom', start: 0, end: 100 });
  }

  /** Puts a picture for a sheet `width` wide in the chart's place: what printing makes of a live canvas differs too much. */
  print(width: number): void {
    this.draw();
    this.chart!.resize({ width });
    this.chart!.getZr().flush();
    const drawing = this.chart!.getRenderedCanvas({ pixelRatio: 2 });
    this.picture = make('canvas', { class: 'picture', width: drawing.width, height: drawing.height, style: `width: ${width}px` });
    this.picture.getContext('2d')!.drawImage(drawing, 0, 0);
    this.canvas.replaceWith(this.picture);
  }

  endPrint(): void {
    this.picture?.replaceWith(this.canvas);
    this.picture = null;
    this.chart?.resize({ width: 'auto' });
    this.chart?.getZr().flush();
  }

  get small(): boolean {
    return this.plan.small ?? false;
  }

  /** What is drawn now: for tests and for looking into a page. */
  get options(): unknown {
    return this.chart?.getOption();
  }
}

function common(look: Look): Option {
  return {
    useUTC: true,
    backgroundColor: 'transparent',
    textStyle: { fontFamily: 'system-ui, "Segoe UI", "DejaVu Sans", sans-serif', color: look.ink, fontSize: 12 },
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
    { type: 'slider', xAxisIndex, filterMode, labelFormatter, height: 26, bottom: 8, left: 64, right: 16, showDataShadow: false, brushSelect: false,
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

// The same style for all units; by default the library sets the larger ones in bold.
const kTimeLabels = { year: '{yyyy}', month: '{MMM}', day: '{d} {MMM}', hour: '{HH}:{mm}', minute: '{HH}:{mm}', second: '{HH}:{mm}:{ss}' };

export interface AxisPlan {
  name?: string;
  log?: boolean;
  [key: string]: unknown;
}

/** An axis in the page's style. */
export function axis(look: Look, plan: AxisPlan): object {
  const { log, name, ...more } = plan;
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
    ...more,
    axisLabel: {
      color: look.muted, hideOverlap: true,
      ...(type === 'value' || type === 'log' ? { formatter: (value: number) => number(value, 5) } : {}),
      ...(type === 'time' ? { formatter: kTimeLabels } : {}),
      ...(more.axisLabel as object | undefined),
    },
  };
}

export function legend(look: Look, more: object = {}): object {
  return {
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
  const canvas = make('div', { class: 'canvas', role: 'img', 'aria-label': plan.title, style: `height: ${plan.height}px` });
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
  if (plan.zoom) {
    tools.append(make('button', {
      type: 'button', class: 'reset', onclick: () => drawn.resetZoom(),
      title: 'Drag across the chart to zoom in, or hold Ctrl and turn the wheel. A double click shows everything again.',
    }, 'Reset zoom'));
  }
  if (plan.values) figure.append(valuesTable(plan.title, plan.values));
  renote();
  drawers.set(figure, drawn);
  coming.observe(figure);
  return Object.assign(figure, {
    redraw: () => {
      renote();
      drawn.redraw();
    },
  });
}

// The table is made when it is opened; most never are.
function valuesTable(title: string, values: () => Values): HTMLElement {
  const details = make('details', {}, make('summary', {}, 'Values'));
  details.addEventListener('toggle', () => {
    while (details.children.length > 1) details.lastChild!.remove();
    if (!details.open) return;
    const { columns, length, row } = values();
    if (length > kRowsShown) {
      details.append(make('p', { class: 'note' }, `${kRowsShown} of ${count(length)} rows, evenly spaced.`));
    }
    details.append(table(columns, spaced(length, kRowsShown).map(row), title));
  });
  return details;
}

/** Draws what is out of view little by little, and everything for a print. Call once, after the page is built. */
export function drawInTime(allDrawn: () => void): void {
  const waiting = [...drawers.values()].slice(0, kDrawnUnasked);
  const next = () => {
    const until = performance.now() + 30;
    while (waiting.length > 0 && performance.now() < until) waiting.shift()!.draw();
    if (waiting.length > 0) setTimeout(next, 0);
    else allDrawn();
  };
  setTimeout(next, 0);

  const all = () => [...drawers.values()];
  onLookChange(() => all().forEach((drawn) => drawn.redraw()));
  window.addEventListener('beforeprint', () => {
    setPrinting(true);
    all().forEach((drawn) => drawn.print(drawn.small ? Math.floor(kPaperWidth / 2) - 16 : kPaperWidth));
  });
  window.addEventListener('afterprint', () => {
    all().forEach((drawn) => drawn.endPrint());
    setPrinting(false);
  });
}

/** What the chart in `figure` draws. */
export function drawnOptions(figure: Element): unknown {
  return drawers.get(figure)?.options;
}
