// The time lines. Only rows in sight are in the document, and in a row only what is in the view;
// spans that would be narrower than can be seen are drawn together, as the worst of them.

const kLeastPixels = 1.5;   // narrower spans join their neighbours
const kTroublePixels = 2;   // what one of them, or some together, measure at least
const kTexturePixels = 5;   // narrower ones have no room for a pattern
const kBeyondPixels = 8;    // how far beyond the edges is drawn, so that no end shows
const kRowsBeyond = 6;
const kLetterPixels = 6.6;
const kMarkPixels = 8;

const kBarTop = 10;
const kMarkMiddle = 5;
const kLabelHeight = 15;
const kCalmShare = 0.45;   // how thin a line of the calm state is: trouble stands out without colour

// What a row draws: items from left to right, the narrow ones last, so that none is hidden. The
// active span is always among them, beyond the edge if need be: it holds the keyboard.
function itemsof(service, view, scale, width, active) {
    const {spans} = service;
    const wide = [];
    const narrow = [];
    let run = null;
    const pixels = (place) => Math.min(width + kBeyondPixels, Math.max(-kBeyondPixels, scale(place)));
    const make = (first, last, x, end, worst) => ({
        key: `${first}-${last}`, service, first, last, x, width: end - x,
        state: spans[worst].state, word: spans[worst].word, inferred: spans[worst].inferred,
    });
    const finish = () => {
        if (run) {
            const item = make(run.first, run.last, run.x, run.end, run.worst);
            item.width = Math.max(item.width, kTroublePixels);
            narrow.push(item);
            run = null;
        }
    };
    const join = (i, x, end) => {
        run = run ?? {first: i, x, worst: i};
        run.last = i;
        run.end = end;
        run.worst = spans[i].state > spans[run.worst].state ? i : run.worst;
        if (run.end - run.x >= kTroublePixels) {
            finish();
        }
    };
    const begin = Math.max(0, d3.bisector((span) => span.to).left(spans, view.from));
    for (let i = begin; i < spans.length && spans[i].from <= view.to; ++i) {
        const x = pixels(spans[i].from);
        const end = pixels(spans[i].to);
        if (i === active) {
            finish();
            narrow.push(make(i, i, x, Math.max(end, x + kTroublePixels), i));
        } else if (end - x >= kLeastPixels) {
            finish();
            wide.push(make(i, i, x, end, i));
        } else {
            join(i, x, end);
        }
    }
    finish();
    const isactive = ({first, last}) => first === active && last === active;
    if (active >= 0 && !narrow.some(isactive)) {
        const x = pixels(spans[active].from);
        narrow.push(make(active, active, x, x + kTroublePixels, active));
    }
    return [...wide, ...narrow];
}

// Marks that would cover each other are one, the gravest.
function signsof(service, view, scale) {
    const places = d3.bisector((mark) => mark.at);
    const first = places.left(service.marks, view.from);
    const last = places.right(service.marks, view.to);
    const shown = [];
    for (const mark of service.marks.slice(first, last).filter((one) => signof(one) > 0)) {
        const x = scale(mark.at);
        const sign = signof(mark);
        const before = shown[shown.length - 1];
        if (before && x - before.x < kMarkPixels) {
            before.sign = Math.max(before.sign, sign);
        } else {
            shown.push({x, sign});
        }
    }
    return shown;
}

// The label of an item, in the middle of what can be seen of it; none for the calm state, and none
// where there is no room.
function labelof({key, word, inferred, x, width}, seen) {
    const text = inferred ? `~${word}` : word;
    const begin = Math.max(0, x);
    const end = Math.min(seen, x + width);
    const length = text.length * kLetterPixels + 8;
    return {key, text, length, x: (begin + end) / 2, fits: word !== 'up' && end - begin > length + 8};
}

// How high an item stands in its row.
function extentdown({word}, height) {
    const share = word === 'up' ? kCalmShare : 1;
    return {top: kBarTop + (height * (1 - share)) / 2, height: height * share};
}

class Timelines {
    constructor({lines, axis, model, view, details}) {
        Object.assign(this, {lines, axis, model, view, details});
        this.services = [];
        this.active = null; // {service, index}
        this.printing = false;
        this.edition = 0; // counts what makes rows look different
        this.asked = false;
        this.drawn = () => {};
    }

    // These services, in this order.
    list(services) {
        this.services = services;
        if (this.active && !services.includes(this.active.service)) {
            this.active = null;
            this.lines.tabIndex = 0;
            this.details.clear();
        }
        this.refresh();
    }

    // Everything is drawn afresh with the next picture.
    refresh() {
        this.edition += 1;
        this.ask();
    }

    // Draws what is missing, with the next picture.
    ask() {
        if (!this.asked) {
            this.asked = true;
            requestAnimationFrame(() => this.draw());
        }
    }

    // Shows the paper's or the screen's version, at once.
    print(printing) {
        this.printing = printing;
        this.edition += 1;
        this.draw();
    }

    draw() {
        this.asked = false;
        this.measure();
        const picture = ticksof(this.view, this.model.clock, this.width);
        this.picture = picture;
        drawaxis(d3.select(this.axis), picture, this.width);
        this.lines.style.height = `${this.services.length * this.rowheight}px`;
        const rows = d3.select(this.lines).selectAll('div.row')
            .data(this.rowsinsight(), ({service}) => service.id)
            .join((enter) => this.addrow(enter))
            .order();
        const timelines = this;
        rows.each(function drawifold(row) {
            this.style.top = `${row.place * timelines.rowheight}px`;
            if (this.edition !== timelines.edition) {
                this.edition = timelines.edition;
                timelines.drawrow(d3.select(this), row.service);
            }
        });
        this.drawn();
    }

    measure() {
        const style = getComputedStyle(this.lines);
        this.width = Math.max(1, this.axis.getBoundingClientRect().width);
        this.rowheight = parseFloat(style.getPropertyValue('--row'));
        this.barheight = parseFloat(style.getPropertyValue('--track')) - kBarTop;
    }

    // The rows that the window shows, some around them, and the one that is chosen.
    rowsinsight() {
        const {top} = this.lines.getBoundingClientRect();
        const first = Math.floor(-top / this.rowheight) - kRowsBeyond;
        const last = Math.ceil((window.innerHeight - top) / this.rowheight) + kRowsBeyond;
        return this.services
            .map((service, place) => ({service, place}))
            .filter(({service, place}) => this.printing || (place >= first && place <= last) ||
                service === this.active?.service);
    }

    addrow(enter) {
        const row = enter.append('div').attr('class', 'row').attr('role', 'group')
            .attr('aria-label', ({service}) => service.name);
        row.append('div').attr('class', 'name').attr('title', ({service}) => service.name)
            .text(({service}) => service.name);
        const svg = row.append('svg').attr('class', 'track');
        for (const layer of ['grid', 'spans', 'labels', 'signs']) {
            svg.append('g').attr('class', layer);
        }
        return row;
    }

    drawrow(row, service) {
        const {picture, width} = this;
        const height = kBarTop + this.barheight;
        const svg = row.select('svg').attr('viewBox', `0 0 ${width} ${height}`);
        const chosen = this.active?.service === service ? this.active.index : -1;
        const items = itemsof(service, this.view, picture.scale, width, chosen);
        row.node().items = items;
        linesdown(svg.select('.grid'), 'tick', picture.ticks, height);
        this.drawspans(svg.select('.spans'), items, chosen);
        this.drawlabels(svg.select('.labels'), items.map((item) => labelof(item, width)).filter(({fits}) => fits));
        this.drawsigns(svg.select('.signs'), signsof(service, this.view, picture.scale));
        linesdown(svg.select('.signs'), 'seam', picture.seams, height);
    }

    drawspans(layer, items, chosen) {
        const ischosen = (item) => single(item) && item.first === chosen;
        layer.selectAll('rect').data(items, ({key}) => key)
            .join((enter) => enter.append('rect')
                .attr('role', 'img')
                .attr('tabindex', -1)
                .attr('aria-label', iteminwords))
            .attr('y', (item) => extentdown(item, this.barheight).top)
            .attr('height', (item) => extentdown(item, this.barheight).height)
            .attr('x', ({x}) => x)
            .attr('width', (item) => item.width)
            .attr('class', ({word}) => `span ${word}`)
            .attr('fill', (item) => (item.width < kTexturePixels ? null :
                lookof(item.word, item.inferred)))
            .classed('plain', (item) => item.width < kTexturePixels)
            .classed('chosen', ischosen)
            .attr('tabindex', (item) => (ischosen(item) ? 0 : -1))
            .attr('aria-describedby', (item) => (ischosen(item) ? this.details.target.id : null))
            .order();
    }

    drawlabels(layer, labels) {
        const middle = kBarTop + this.barheight / 2;
        layer.selectAll('rect').data(labels, ({key}) => key).join('rect')
            .attr('x', ({x, length}) => x - length / 2).attr('width', ({length}) => length)
            .attr('y', middle - kLabelHeight / 2).attr('height', kLabelHeight).attr('rx', 3);
        layer.selectAll('text').data(labels, ({key}) => key).join('text')
            .attr('x', ({x}) => x).attr('y', middle).text(({text}) => text)
            .raise();
    }

    drawsigns(layer, signs) {
        layer.selectAll('path').data(signs).join('path')
            .attr('class', ({sign}) => `mark ${kSigns[sign].name}`)
            .classed('line', ({sign}) => kSigns[sign].line === true)
            .attr('d', ({sign}) => kSigns[sign].path)
            .attr('transform', ({x}) => `translate(${x},${kMarkMiddle})`);
    }

    // The item of a row at a place on the screen: a narrow one that is near, or else the one below.
    itemat(row, clientX, near) {
        const x = clientX - row.querySelector('svg').getBoundingClientRect().left;
        const distance = (item) => Math.max(item.x - x, x - item.x - item.width, 0);
        const reachable = (row.items ?? []).filter((item) => distance(item) <= near)
            .map((item) => ({item, far: distance(item) + Math.min(item.width, 2 * near)}));
        const [nearest] = reachable.sort((a, b) => a.far - b.far);
        return nearest?.item ?? null;
    }

    placeat(clientX) {
        const {left} = this.axis.getBoundingClientRect();
        return this.view.from + ((clientX - left) / this.width) * this.view.length;
    }

    // Chooses a span of a service and, if `focus`, takes the keyboard there.
    choose(service, index, focus) {
        this.active = {service, index};
        const span = service.spans[index];
        this.view.reveal(span.from, span.to);
        this.edition += 1;
        this.lines.tabIndex = -1;
        this.details.show(this.chosenitem(), false);
        this.scrolltorow(this.services.indexOf(service));
        this.draw();
        if (focus) {
            this.lines.querySelector('.chosen')?.focus({preventScroll: true});
        }
    }

    // The keyboard stays on the lines as a whole.
    unchoose() {
        this.active = null;
        this.lines.tabIndex = 0;
        this.details.clear();
        this.lines.focus({preventScroll: true});
        this.edition += 1;
        this.draw();
    }

    chosenitem() {
        const {service, index} = this.active;
        const span = service.spans[index];
        return {key: `${index}-${index}`, service, first: index, last: index, ...span};
    }

    // What is told while nothing is pointed at.
    rest() {
        if (this.active) {
            this.details.show(this.chosenitem(), false);
        } else {
            this.details.clear();
        }
    }

    // Brings a row between the axis and the details, which cover what is below them.
    scrolltorow(place) {
        const top = this.lines.getBoundingClientRect().top + place * this.rowheight;
        const upper = this.axis.getBoundingClientRect().bottom;
        const lower = Math.min(window.innerHeight,
            this.details.target.getBoundingClientRect().top) - this.rowheight;
        if (top < upper) {
            window.scrollBy(0, top - upper);
        } else if (top > lower) {
            window.scrollBy(0, top - lower);
        }
    }
}
